// SPDX-License-Identifier: MIT
#include "analysis/spectrum_accumulator.hpp"

#include <algorithm>
#include <cmath>

#include "terminal/failure.hpp"

namespace tool {

spectrum_accumulator::spectrum_accumulator(const lumra::spectrum_settings &settings, bool real) : hold_(settings.hold) {
  lumra_spectrum_options options = LUMRA_SPECTRUM_OPTIONS;
  options.type = real ? LUMRA_TYPE_F32 : LUMRA_TYPE_CF32;
  options.sample_rate_hz = settings.sample_rate_hz;
  options.centre_hz = settings.centre_hz;
  options.points = settings.points;
  options.window = settings.window;
  options.window_parameter = settings.window_parameter;
  options.hold = hold_ ? LUMRA_HOLD_EXTREMES : LUMRA_HOLD_NONE;
  options.overlap = settings.overlap;
  options.threads = settings.threads;
  options.start = settings.start;
  options.origin = settings.origin;
  lumra_spectrum_average *made = nullptr;
  lumra::check_open(lumra_spectrum_create(&options, &made));
  average_.reset(made);
}

std::uint64_t spectrum_accumulator::segments() const {
  lumra_spectrum_extent extent = {};
  lumra::check_open(lumra_spectrum_where(average_.get(), &extent));
  return extent.segments;
}

lumra::averaged_spectrum spectrum_accumulator::read() const {
  lumra_spectrum_extent extent = {};
  lumra::check_open(lumra_spectrum_where(average_.get(), &extent));
  lumra::averaged_spectrum result;
  const auto bins = static_cast<std::size_t>(extent.bins);
  result.power.resize(bins);
  if (hold_) {
    result.maximum.resize(bins);
    result.minimum.resize(bins);
  }
  result.info.size = sizeof result.info;
  lumra::check_open(lumra_spectrum_read(average_.get(), &result.info, result.power.data(),
                                        hold_ ? result.maximum.data() : nullptr,
                                        hold_ ? result.minimum.data() : nullptr, bins));
  if (!std::all_of(result.power.begin(), result.power.end(), [](double power) { return std::isfinite(power); }))
    throw failure("the samples are too large for single precision; scale the recording down");
  return result;
}

}  // namespace tool
