// Taps of symmetric filters. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <numbers>
#include <span>

#include "signal/bessel.hpp"

namespace dsp {

/// Longest filter that is designed: a second's work.
inline constexpr double longest_design = 1 << 24;

inline double sinc(double x) noexcept {
  return x == 0 ? 1 : std::sin(std::numbers::pi * x) / (std::numbers::pi * x);
}

/// A response of time on a symmetric filter: h(t, middle) for the distances t from its middle, of which each is
/// computed once.
template <class Real, class Response>
void make_symmetric(std::span<Real> taps, Response h) {
  const std::size_t n = taps.size();
  const double middle = static_cast<double>(n - 1) / 2;
  for (std::size_t k = 0; 2 * k < n; ++k)
    taps[k] = taps[n - 1 - k] = static_cast<Real>(h(static_cast<double>(k) - middle, middle));
}

/// J. F. Kaiser, "Nonrecursive digital filter design using the I0-sinh window function", Proc. IEEE ISCAS (1974),
/// 20-23.
struct kaiser_formulas {
  double beta;
  double width;  // of the transition in cycles per sample, times the distance of the outermost taps

  explicit kaiser_formulas(double attenuation) noexcept
      : beta(attenuation > 50   ? 0.1102 * (attenuation - 8.7)
             : attenuation > 21 ? 0.5842 * std::pow(attenuation - 21, 0.4) + 0.07886 * (attenuation - 21)
                                : 0),
        width(attenuation > 21 ? (attenuation - 7.95) / 14.36 : 0.9222) {}
};

/// A low pass with its edge at half of `edge` cycles per sample, cut by Kaiser's window.
class kaiser_lowpass_response {
 public:
  kaiser_lowpass_response(double edge, double beta) noexcept : edge_(edge), beta_(beta), peak_(bessel_i0(beta)) {}
  double operator()(double t, double middle) const noexcept {
    const double x = middle == 0 ? 0 : t / middle;
    return edge_ * sinc(edge_ * t) * bessel_i0(beta_ * std::sqrt(std::max(0.0, 1 - x * x))) / peak_;
  }

 private:
  double edge_, beta_, peak_;
};

/// A root raised cosine at t symbols, 1 symbol a unit.
inline double root_raised_cosine(double t, double roll_off) noexcept {
  constexpr double pi = std::numbers::pi;
  // Closer to a zero of the divisor the limit is the better value: both are off by some 1e-8 there.
  constexpr double close = 1e-8;
  if (std::abs(t) < close) return 1 - roll_off + 4 * roll_off / pi;
  const double x = 4 * roll_off * t, divisor = 1 - x * x;
  if (std::abs(divisor) < close) {
    const double angle = pi / (4 * roll_off);
    return roll_off / std::numbers::sqrt2 * ((1 + 2 / pi) * std::sin(angle) + (1 - 2 / pi) * std::cos(angle));
  }
  return (std::sin(pi * t * (1 - roll_off)) + x * std::cos(pi * t * (1 + roll_off))) / (pi * t * divisor);
}

/// Number of taps of a root raised cosine over `span` symbols of `samples` samples.
inline double root_raised_cosine_length(double samples, double span) noexcept {
  return std::round(span * samples) + 1;
}

/// A low pass with a realised rejection.
struct lowpass_request {
  double pass, stop;  // edges in cycles per sample, 0 <= pass < stop <= 0.5
  double deviation;   // largest gain from the stop edge, largest difference of the gain from 1 up to the pass edge
};

struct lowpass_design {
  double length;  // number of taps, perhaps above longest_design
  double beta;
};

/// The shortest Kaiser low pass, nearly, that keeps the deviation. Throws std::bad_alloc, dfti_failure.
[[nodiscard]] lowpass_design design_kaiser_lowpass(const lowpass_request &request);

/// The taps of a design of at most longest_design taps, with gain 1 at frequency 0.
void make_kaiser_lowpass(const lowpass_request &request, double beta, std::span<double> taps) noexcept;

/// The taps of a root raised cosine with `samples` samples a symbol and energy 1.
void make_root_raised_cosine(double samples, double roll_off, std::span<double> taps) noexcept;

}  // namespace dsp
