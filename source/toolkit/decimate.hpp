// Decimation on plain memory. SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <bit>
#include <complex>
#include <cstdint>
#include <span>
#include <type_traits>

#include "toolkit/frame.hpp"
#include "toolkit/lanes.hpp"

namespace toolkit {

enum class decimation { pick, average };

namespace detail {

/// Sum of `factor` samples, over several lanes where that pays.
template <class T>
T block_sum(const T *x, std::int64_t factor) noexcept {
  using real = decltype(std::real(T{}));
  constexpr std::int64_t width = 32 / sizeof(T);
  using parts = lanes<real, 32 / sizeof(real)>;
  parts whole;
  std::int64_t i = 0;
  for (; i + width <= factor; i += width) whole += parts::load(reinterpret_cast<const real *>(x + i));
  T sum = folded(std::bit_cast<std::array<T, width>>(whole));
  for (; i < factor; ++i) sum += x[i];
  return sum;
}

/// Means of groups that are too short for lanes: four groups side by side hide the latency of the additions.
template <class T, class Real>
void average_short(const T *x, T *out, std::int64_t count, std::int64_t factor, Real divisor) noexcept {
  std::int64_t k = 0;
  for (; k + 4 <= count; k += 4, x += 4 * factor) {
    T sum[4] = {x[0], x[factor], x[2 * factor], x[3 * factor]};
    for (std::int64_t j = 1; j < factor; ++j)
      for (std::int64_t l = 0; l < 4; ++l) sum[l] += x[l * factor + j];
    for (std::int64_t l = 0; l < 4; ++l) out[k + l] = sum[l] / divisor;
  }
  for (; k < count; ++k, x += factor) {
    T sum = x[0];
    for (std::int64_t j = 1; j < factor; ++j) sum += x[j];
    out[k] = sum / divisor;
  }
}

/// The same for a factor known to the compiler, in whole registers.
template <std::int64_t factor, class T, class Real>
void average_fixed(const T *x, T *out, std::int64_t count, Real divisor) noexcept {
  constexpr std::int64_t parts = std::is_same_v<T, Real> ? 1 : 2;
  const auto *const in = reinterpret_cast<const Real *>(x);
  auto *const to = reinterpret_cast<Real *>(out);
  constexpr std::int64_t together = 16;
  Real sum[together * parts];
  for (std::int64_t k = 0; k < count; k += together) {
    const std::int64_t n = std::min(together, count - k);
    if (n < together) return average_short(x + k * factor, out + k, n, factor, divisor);
    const Real *const from = in + k * factor * parts;
    for (std::int64_t l = 0; l < together; ++l)
      for (std::int64_t part = 0; part < parts; ++part) {
        Real &s = sum[l * parts + part];
        s = from[l * factor * parts + part];
        for (std::int64_t j = 1; j < factor; ++j) s += from[(l * factor + j) * parts + part];
      }
    for (std::int64_t l = 0; l < together * parts; ++l) to[k * parts + l] = sum[l] / divisor;
  }
}

}  // namespace detail

/// Writes floor(x.size() / factor) samples to the front of `out`, which may be x itself.
template <class T>
void decimate(std::span<const T> x, std::span<T> out, std::int64_t factor, decimation how) {
  using real = decltype(std::real(T{}));
  const auto count = static_cast<std::int64_t>(x.size()) / factor;
  require(static_cast<std::int64_t>(out.size()) >= count, destination_too_small);
  if (factor == 1) {
    if (out.data() != x.data()) std::copy(x.begin(), x.end(), out.begin());
    return;
  }
  const auto divisor = static_cast<real>(factor);
  if (how == decimation::pick) {
    for (std::int64_t k = 0; k < count; ++k) out[static_cast<std::size_t>(k)] = x[static_cast<std::size_t>(k * factor)];
  } else if (factor == 2) {
    detail::average_fixed<2>(x.data(), out.data(), count, divisor);
  } else if (factor == 3) {
    detail::average_fixed<3>(x.data(), out.data(), count, divisor);
  } else if (factor < static_cast<std::int64_t>(128 / sizeof(T))) {
    detail::average_short(x.data(), out.data(), count, factor, divisor);
  } else {
    for (std::int64_t k = 0; k < count; ++k)
      out[static_cast<std::size_t>(k)] = detail::block_sum(x.data() + k * factor, factor) / divisor;
  }
}

}  // namespace toolkit
