// Windows that are sums of cosines: w[i] = 1/d sum over k of (-1)^k a[k] cos(2 pi k i / n). SPDX-License-Identifier:
// MIT
#pragma once

#include <algorithm>
#include <cmath>
#include <complex>
#include <cstdint>
#include <numbers>
#include <span>
#include <type_traits>
#include <utility>

#include "qsrfhs/vector/kernels/kernels.hpp"

namespace dsp {

struct cosine_sum {
  std::int32_t terms;
  double a[7];
};

/// The windows by their number in the interface; no terms where a number has none.
inline constexpr cosine_sum cosine_sums[] = {
    {1, {1.0}},
    {2, {0.5, 0.5}},
    {2, {0.54, 0.46}},
    {3, {0.42323, 0.49755, 0.07922}},
    {3, {0.4265907136715391, 0.4965606190885641, 0.07684866723989682}},
    {3, {0.42, 0.5, 0.08}},
    {5, {0.215578948, 0.41663158, 0.277263158, 0.083578947, 0.006947368}},
    {4, {0.35875, 0.48829, 0.14128, 0.01168}},
    {7,
     {0.27105140069342415, 0.43329793923448606, 0.21812299954311062, 0.0659254463880309, 0.010811742098372268,
      0.0007765848252250934, 1.3887217350903198e-05}},
    {5, {0.323215218, 0.471492057, 0.17553428, 0.028497078, 0.001261367}},
    {0, {}},
    {4, {0.3635819, 0.4891775, 0.1365995, 0.0106411}},
    {5, {0.21557895, 0.41663158, 0.277263158, 0.083578947, 0.006947368}},
};

// With u = sin^2(pi i / n) a window is a polynomial in u: (-1)^k cos(2 pi k i / n) = T_k(2u - 1), T_k the Chebyshev
// polynomials. One sine per sample then serves all harmonics, and where the window comes close to zero, at its ends,
// u does, so that nothing cancels.

/// Doubles that expand() works in.
constexpr std::size_t expansion_size(const cosine_sum &window) noexcept {
  return 4 * static_cast<std::size_t>(window.terms);
}

/// Coefficients of the polynomial, of u^0 first, into the first ones of `tables`, which holds expansion_size values.
/// Two terms or more.
inline void expand(const cosine_sum &window, double divisor, std::span<double> tables) noexcept {
  const auto m = static_cast<std::size_t>(window.terms);
  std::fill(tables.begin(), tables.end(), 0.0);
  const auto polynomial = tables.subspan(0, m);
  auto next = tables.subspan(m, m), current = tables.subspan(2 * m, m), before = tables.subspan(3 * m, m);
  // T_(k+1)(v) = 2 v T_k(v) - T_(k-1)(v) with v = 2u - 1, from T_0 = 1 and T_(-1) = v.
  current[0] = 1.0;
  before[0] = -1.0;
  before[1] = 2.0;
  for (std::size_t k = 0; k < m; ++k) {
    for (std::size_t i = 0; i < m; ++i) {
      polynomial[i] += window.a[k] / divisor * current[i];
      next[i] = (i > 0 ? 4.0 * current[i - 1] : 0.0) - 2.0 * current[i] - before[i];
    }
    std::swap(before, current);
    std::swap(current, next);
  }
}

/// Sines and cosines of j * step for j below `block`, each made from two others by at most log2(block) rotations.
struct rotations {
  static constexpr std::int64_t block = 512, group = 8;  // kernels go by groups
  alignas(64) double cosine[block], sine[block];

  /// At least `count` of them, in whole groups.
  rotations(double step, std::int64_t count) noexcept {
    cosine[0] = 1.0;
    sine[0] = 0.0;
    for (std::int64_t half = 1; half < std::max(count, group); half *= 2) {
      const double c = std::cos(step * static_cast<double>(half)), s = std::sin(step * static_cast<double>(half));
      for (std::int64_t j = 0; j < half; ++j) {
        cosine[half + j] = cosine[j] * c - sine[j] * s;
        sine[half + j] = sine[j] * c + cosine[j] * s;
      }
    }
  }
  [[nodiscard]] qsrfhs::kernels::turned_angles turned_by(double angle) const noexcept {
    return {cosine, sine, std::cos(angle), std::sin(angle)};
  }
};

/// Multiplies n samples by the window of period n that expand() made the coefficients of. Two terms or more. As
/// w[i] = w[n - i], half of the window is computed.
template <class T, class Real = decltype(std::real(T{}))>
void multiply_by(const cosine_sum &window, const double *coefficients, T *data, std::int64_t n) noexcept {
  const std::span<const double> polynomial(coefficients, static_cast<std::size_t>(window.terms));
  double peak = polynomial.back();  // at a squared sine of 1
  for (std::size_t k = polynomial.size() - 1; k-- > 0;) peak = peak + polynomial[k];
  data[0] *= static_cast<Real>(polynomial[0]);
  if (n % 2 == 0) data[n / 2] *= static_cast<Real>(peak);

  const double step = std::numbers::pi / static_cast<double>(n);
  const rotations table(step, std::min(n, rotations::block));
  const std::int64_t pairs = (n - 1) / 2;
  const auto &kernels = qsrfhs::kernels::exact();
  for (std::int64_t first = 1; first <= pairs; first += rotations::block) {
    const std::int64_t count = std::min(pairs - first + 1, rotations::block);
    // Every block starts from an angle of its own, so that errors do not add up.
    const auto angles = table.turned_by(step * static_cast<double>(first));
    const auto weigh_ends = [&](auto kernel) {
      kernel(angles, polynomial.data(), polynomial.size(), reinterpret_cast<Real *>(data + first),
             reinterpret_cast<Real *>(data + n - first - count + 1), static_cast<std::size_t>(count));
    };
    if constexpr (std::is_same_v<T, float>)
      weigh_ends(kernels.cosine_window);
    else if constexpr (std::is_same_v<T, double>)
      weigh_ends(kernels.cosine_window_double);
    else if constexpr (std::is_same_v<Real, float>)
      weigh_ends(kernels.complex_cosine_window);
    else
      weigh_ends(kernels.complex_cosine_window_double);
  }
}

}  // namespace dsp
