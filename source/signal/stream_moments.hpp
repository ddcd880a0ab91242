// Sums over two streams from which their alignment follows. SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <complex>
#include <cstddef>
#include <span>

#include "signal/evm_alignment.hpp"

namespace dsp {

/// Sums over samples u of a reference on a model's delay and carrier, its derivatives v by the delay, measured samples
/// m, and their times t. Those with v are 0 where no slopes were given.
struct stream_moments {
  double reference = 0, measured = 0;  // |u|^2, |m|^2
  std::complex<double> product = 0;    // m conj(u)
  std::complex<double> reference_dc = 0, measured_dc = 0;
  double timed = 0, timed_twice = 0;                             // t |u|^2, t^2 |u|^2
  std::complex<double> timed_product = 0, timed_dc = 0;          // t m conj(u), t u
  double slope = 0;                                              // |v|^2
  std::complex<double> slope_reference = 0, slope_measured = 0;  // v conj(u), m conj(v)
  std::complex<double> slope_dc = 0, timed_slope = 0;            // v, t v conj(u)

  static constexpr std::size_t count = 23;
  using numbers = std::array<double, count>;

  /// Adds neighbouring samples, the first at time t; `slopes` is empty or as long as `carried`.
  template <class Sample>
  void add(std::span<const std::complex<double>> carried, std::span<const std::complex<double>> slopes,
           const Sample *measured_samples, double t) noexcept;
  void add(const stream_moments &other) noexcept;
  /// Of the same samples where times are counted from `earlier` before.
  [[nodiscard]] stream_moments later(double earlier) const noexcept;
};

/// How a model is to change, and what goes with it then.
struct model_change {
  std::complex<double> kept_gain = 1;     // is given: with which the dc goes where no gain is wanted
  std::complex<double> gain = 1, dc = 0;  // the gain at time 0
  double delay = 0, frequency = 0;
  double fitted = 0, measured = 0;  // powers, of the signal that the old model explains and of all
};

/// By Gauss's and Newton's method from sums over so many samples. Gain always; dc, delay and frequency where they are
/// wanted. Unrelated is what is silent or not finite.
alignment_outcome improve(const stream_moments &sums, double samples, const alignment &wanted, model_change &change);

}  // namespace dsp
