// How a stream is taken apart into channels. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "signal/exact_cycles.hpp"
#include "signal/rate_ratio.hpp"

namespace dsp {

/// A band of a stream and the rate at which it is wanted.
struct channel_request {
  exact_cycles centre;  // per sample of the stream
  rate_ratio ratio;     // at most 1
  double passband;      // fraction of half the channel's rate, above 0, below 1

  /// Nothing to be shifted, nothing to be filtered.
  [[nodiscard]] bool is_whole() const noexcept { return ratio.is_one() && centre.units == 0; }
};

/// What becomes of a channel's bins.
enum class channel_way {
  whole,         // the stream's samples are the channel's
  exact,         // the backward transform has the channel's rate
  interpolated,  // it has at least twice that rate, and an interpolator the rest of the ratio
  coarse         // it has a wide filter and many times the rate; a plan of its own has the rest
};

struct channel_step {
  channel_way way;
  std::size_t points;  // of the backward transform
};

/// Blocks of `points` samples that begin `hop` samples apart. Of what a block gives, the parts that belong to `overlap`
/// / 2 samples at either end are dropped.
struct channel_plan {
  std::size_t points = 0, overlap = 0;
  std::vector<channel_step> steps;  // one a channel

  [[nodiscard]] std::size_t hop() const noexcept { return points - overlap; }
};

/// The cheapest plan, or nearly, with the shortest blocks. Rejection in dB. Always the same for the same channels.
/// Throws std::bad_alloc.
[[nodiscard]] channel_plan plan_channels(std::span<const channel_request> channels, double rejection);

}  // namespace dsp
