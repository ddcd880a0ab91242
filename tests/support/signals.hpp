// Signals of the tests, and transforms of them by definition. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <cstdint>
#include <numbers>
#include <type_traits>
#include <vector>

namespace tests {

/// Reproducible values between -1 and 1, exact in single precision; complex types have two of them.
template <class T>
std::vector<T> noise_of(std::size_t n, std::uint32_t seed = 1) {
  const auto next = [&seed] {
    seed = seed * 1664525U + 1013904223U;
    return static_cast<float>(seed >> 8) / 8388608.F - 1.F;
  };
  std::vector<T> out(n);
  for (T &value : out) {
    if constexpr (std::is_floating_point_v<T>)
      value = next();
    else
      value = {next(), next()};
  }
  return out;
}

/// y[k] = sum over i of x[i] exp(sign j 2 pi k i / n).
inline std::vector<std::complex<double>> transform_of(const std::vector<std::complex<double>> &x, double sign) {
  const std::size_t n = x.size();
  std::vector<std::complex<double>> root(n), y(n);
  for (std::size_t k = 0; k < n; ++k)
    root[k] = std::polar(1.0, sign * 2 * std::numbers::pi * static_cast<double>(k) / static_cast<double>(n));
  for (std::size_t k = 0; k < n; ++k)
    for (std::size_t i = 0; i < n; ++i) y[k] += x[i] * root[k * i % n];
  return y;
}

}  // namespace tests
