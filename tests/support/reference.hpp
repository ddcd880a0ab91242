// What results are compared with: reproducible records, definitions in double precision, and how far off a result may
// lie. SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <complex>
#include <cstdint>
#include <numbers>
#include <type_traits>
#include <vector>

#include "support/near.hpp"

namespace tests {

using reference = std::vector<std::complex<double>>;

template <class Values>
reference wide(const Values &from) {
  return reference(from.begin(), from.end());
}

/// Reproducible values, real or complex, whose parts lie between -1 and 1 and are exact in single precision.
template <class T>
std::vector<T> noise_of(std::size_t n, std::uint32_t seed = 1) {
  using real = decltype(std::real(T{}));
  const auto next = [&seed] {
    seed = seed * 1664525U + 1013904223U;
    return static_cast<real>(static_cast<float>(seed >> 8) / 8388608.F - 1.F);
  };
  std::vector<T> out(n);
  for (auto &v : out) {
    const real first = next();
    if constexpr (std::is_same_v<T, real>)
      v = first;
    else
      v = {first, next()};
  }
  return out;
}

/// Growth of rounding errors: of transforms of n points, and of sums of n terms; a small constant for all types.
inline double transform_bound(std::size_t n) {
  return 2.0 * (1.0 + std::log2(static_cast<double>(n)));
}
inline double sum_bound(std::size_t n) {
  return 1.0 + static_cast<double>(n);
}

/// The discrete Fourier transform by its definition.
inline reference dft(const reference &x, int sign = -1) {
  const std::size_t n = x.size();
  reference roots(n), out(n);
  for (std::size_t k = 0; k < n; ++k)
    roots[k] = std::polar(1.0, sign * 2.0 * std::numbers::pi * static_cast<double>(k) / static_cast<double>(n));
  for (std::size_t k = 0; k < n; ++k)
    for (std::size_t i = 0; i < n; ++i) out[k] += x[i] * roots[k * i % n];
  return out;
}

}  // namespace tests
