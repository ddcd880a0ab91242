// SPDX-License-Identifier: MIT
#include "signal/band_filter.hpp"

#include <cmath>
#include <cstddef>
#include <numbers>

namespace dsp {

band_filter::band_filter(const band_edges &edges, double rejection) noexcept
    : edge_((edges.pass + edges.stop) / 2),
      length_(design(rejection).width / (edges.stop - edges.pass)),
      beta_(design(rejection).beta),
      scale_(length_ / bessel_i0(beta_)) {}

/// The window's Fourier transform, of area 1.
double band_filter::window_response(double frequency) const noexcept {
  const double angle = std::numbers::pi * length_ * frequency, square = beta_ * beta_ - angle * angle;
  const double root = std::sqrt(std::abs(square));
  if (root < 1e-4) return scale_ * (1 + square / 6);
  return scale_ * (square > 0 ? std::sinh(root) : std::sin(root)) / root;
}

/// Gauss's rule with six points, which is exact to rounding over half a cycle in the filter's length.
double band_filter::integral(double from, double to) const noexcept {
  constexpr double points[] = {0.2386191860831969, 0.6612093864662645, 0.9324695142031521};
  constexpr double weights[] = {0.4679139345726910, 0.3607615730481386, 0.1713244923791704};
  const double middle = (from + to) / 2, half = (to - from) / 2;
  double sum = 0;
  for (int k = 0; k < 3; ++k)
    sum += weights[k] * (window_response(middle - half * points[k]) + window_response(middle + half * points[k]));
  return half * sum;
}

/// The response of the sinc is a box; under the window it is the window's response, integrated over the box.
void band_filter::make_gains(double first, double step, std::span<double> gains) const noexcept {
  std::fill(gains.begin(), gains.end(), 0.0);
  for (const double side : {1.0, -1.0}) {
    double at = first + side * edge_, sum = 0;
    const auto steps = static_cast<std::size_t>(std::ceil(std::abs(at) / step));
    const double part = at / static_cast<double>(std::max<std::size_t>(steps, 1));
    for (std::size_t k = 0; k < steps; ++k)
      sum += integral(part * static_cast<double>(k), part * static_cast<double>(k + 1));
    for (double &gain : gains) {
      gain += side * sum;
      sum += integral(at, at + step);
      at += step;
    }
  }
}

double band_filter::ripple(double rejection) noexcept {
  return 20 * std::log10(1 + std::pow(10, -std::max(rejection, least_attenuation - margin) / 20));
}

}  // namespace dsp
