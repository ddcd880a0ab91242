// A recording at a new rate, from front to back. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstdint>
#include <functional>
#include <span>
#include <vector>

#include "recording/source.hpp"

namespace tool {

/// The low-pass whose taps are interpolated. Frequencies are fractions of the lower of both rates, figures those of the
/// response that the interpolated taps have.
struct resampling_filter {
  std::vector<float> coefficients;  // sum 1
  std::int32_t phases = 0;          // coefficients per sample of the lower rate
  double pass_edge = 0, stop_edge = 0;
  double ripple = 0;     // largest deviation of the gain from 1 up to the pass edge
  double rejection = 0;  // largest gain from the stop edge on, images of the interpolation included
};

/// Output k lies at input sample k * ratio, as far as the recording reaches; the recording has zeros around it.
class resampling {
 public:
  /// Source and stretch must outlive this. Throws failure where the rates are further apart than a factor of 65536, at which
  /// the filter takes 100 MB.
  resampling(const recording::source &source, const recording::stretch &over, double wanted_rate);

  /// How many input samples one output stands for; the library's resamplers take it in single precision.
  [[nodiscard]] double ratio() const noexcept { return static_cast<double>(ratio_); }
  /// The rate of the outputs in hertz: the one wanted, unless that is another ratio in single precision.
  [[nodiscard]] double rate() const noexcept { return rate_; }
  /// How many inputs there are.
  [[nodiscard]] std::uint64_t samples_in() const noexcept { return over_.samples; }
  /// How many outputs there are.
  [[nodiscard]] std::uint64_t samples() const noexcept;
  [[nodiscard]] const resampling_filter &filter() const noexcept { return filter_; }

  /// Calls write with the outputs in order, having read `block` samples at most at a time; the outputs do not depend on
  /// that. Throws failure, also for outputs beyond single precision, and lumra::error when the library refuses.
  void run(std::uint64_t block, const std::function<void(std::span<const std::complex<float>>)> &write) const;

 private:
  const recording::source &source_;
  const recording::stretch &over_;
  float ratio_;
  double rate_;
  resampling_filter filter_;
};

}  // namespace tool
