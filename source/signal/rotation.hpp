// Samples on a turning carrier. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cmath>
#include <complex>
#include <cstddef>
#include <numbers>
#include <span>

namespace dsp {

/// exp(2 pi j cycles), exact for many cycles.
inline std::complex<double> on_circle(double cycles) noexcept {
  const double angle = 2 * std::numbers::pi * (cycles - std::nearbyint(cycles));
  return {std::cos(angle), std::sin(angle)};
}

/// Multiplication without the recovery of infinities from NaN.
inline std::complex<double> times(std::complex<double> a, std::complex<double> b) noexcept {
  return {a.real() * b.real() - a.imag() * b.imag(), a.real() * b.imag() + a.imag() * b.real()};
}

/// out[k] = scale x[k] exp(2 pi j step (first + k)); step in cycles. out may be x.
inline void rotate(std::span<const std::complex<double>> x, double step, double first, double scale,
                   std::span<std::complex<double>> out) noexcept {
  // Products of a coarse and a fine table, so that rounding does not grow along the record.
  constexpr std::size_t run = 64;
  std::complex<double> fine[run];
  for (std::size_t k = 0; k < run; ++k) fine[k] = on_circle(step * static_cast<double>(k));
  for (std::size_t begin = 0; begin < x.size(); begin += run) {
    const std::complex<double> coarse = scale * on_circle(step * (first + static_cast<double>(begin)));
    const std::size_t count = std::min(run, x.size() - begin);
    for (std::size_t k = 0; k < count; ++k) out[begin + k] = times(times(x[begin + k], fine[k]), coarse);
  }
}

}  // namespace dsp
