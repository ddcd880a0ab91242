// How a ratio of rates is made up of steps. SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <vector>

#include "signal/rate_ratio.hpp"
#include "signal/resampling_block.hpp"

namespace dsp {

/// Blocks in the order of the stream, then perhaps an interpolator. Those with wide transitions take away, or add, most
/// of the rate; the one with the narrow transition works at a low rate. The interpolator gives the ratios that are no
/// fractions of small numbers. Nothing: both rates are the same.
struct resampling_plan {
  std::vector<block_design> blocks;
  std::optional<rate_ratio> rest;  // of the interpolator's rates
  double cost = 0;                 // of an input sample, as that of blocks
  double rejection = 0;            // in dB, which every step has; that which was asked for, or more
};

/// The plan with the lowest cost. The pass band is a fraction of half the lower rate; what lies beyond that half is
/// rejected, in dB. Throws std::bad_alloc.
[[nodiscard]] resampling_plan plan_resampling(const rate_ratio &ratio, double passband, double rejection);

}  // namespace dsp
