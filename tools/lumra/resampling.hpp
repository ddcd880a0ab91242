// A recording at a new rate, from front to back. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstdint>
#include <functional>
#include <span>
#include <vector>

#include "recording.hpp"

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

resampling_filter design_resampling_filter();

/// Of the factor between the rates, up or down; the filter of this one takes 100 MB.
inline constexpr float largest_ratio = 65536;

/// How many samples result: output k lies at input sample k * ratio, as far as the recording reaches.
std::uint64_t resampled_count(const recording &source, float ratio);

/// Calls write with the outputs in order; the recording has zeros around it. Throws failure, also for outputs beyond
/// single precision.
void resample(const recording &source, const resampling_filter &filter, float ratio, std::uint64_t block,
              const std::function<void(std::span<const std::complex<float>>)> &write);

}  // namespace tool
