// SPDX-License-Identifier: MIT
#include "signal/channel_plan.hpp"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <limits>
#include <numeric>

#include "signal/band_filter.hpp"

namespace dsp {
namespace {

constexpr std::size_t least_points = 64, most_points = std::size_t{1} << 20;
constexpr std::size_t most_divisor = std::size_t{1} << 16;  // of the blocks' length, from the channels' rates
constexpr std::size_t overlaps[] = {2, 4, 8, 16};           // blocks overlap by one such part of them

// Costs in the time that a transform in the caches takes for one point and one halving.
constexpr double call = 1000;         // of a transform, beside its points
constexpr double passes = 6;          // over each point: copies and the product with the gains
constexpr double interpolation = 55;  // of an output
constexpr double further_steps = 90;  // of an input, where a channel is not ready
double transform_cost(double points) noexcept {
  constexpr double in_cache = 1 << 16, slower = 1.6;
  return call + points * (passes + (points <= in_cache ? 1 : slower) * std::log2(points));
}

bool is_fast(std::size_t length) noexcept {
  for (const std::size_t prime : {13U, 11U, 7U, 5U, 3U, 2U})
    while (length % prime == 0) length /= prime;
  return length == 1;
}

/// The least fast number from `least` on that `divisor`, a power of two, divides.
std::size_t fast_multiple(double least, std::size_t divisor) noexcept {
  auto multiple = static_cast<std::size_t>(std::ceil(std::max(least, 1.0) / static_cast<double>(divisor)));
  while (!is_fast(multiple)) ++multiple;
  return multiple * divisor;
}

/// Blocks of a multiple of this many samples have whole numbers of samples in as many channels as possible.
std::size_t common_length(std::span<const channel_request> channels) noexcept {
  std::size_t common = 1;
  for (const channel_request &channel : channels) {
    if (channel.ratio.down() > most_divisor) continue;
    const auto down = static_cast<std::size_t>(channel.ratio.down());
    if (const std::size_t both = std::lcm(common, down); both <= most_divisor && is_fast(both)) common = both;
  }
  return common;
}

class planner {
 public:
  planner(std::span<const channel_request> channels, double rejection)
      : channels_(channels), width_(band_filter::length_of_transition(rejection)) {}

  /// Cost of a sample of the stream, infinite where no such blocks will do.
  double choose(std::size_t points, std::size_t parts, std::vector<channel_step> &steps) const {
    const std::size_t taken = points - points / parts;
    const auto hop = static_cast<double>(taken);
    double cost = transform_cost(static_cast<double>(points)) / hop;
    steps.clear();
    for (const channel_request &channel : channels_) {
      const channel_step step = choose(channel, points, parts);
      if (step.way != channel_way::whole && step.points == 0) return std::numeric_limits<double>::infinity();
      steps.push_back(step);
      if (step.way == channel_way::whole) continue;
      const auto backward = static_cast<double>(step.points);
      cost += transform_cost(backward) / hop;
      if (step.way == channel_way::interpolated) cost += interpolation * channel.ratio.value();
      if (step.way == channel_way::coarse) cost += further_steps * backward / static_cast<double>(points);
    }
    return cost;
  }

 private:
  /// Both a block and what of it is dropped at either end have whole numbers of samples in the channel.
  [[nodiscard]] channel_step choose(const channel_request &channel, std::size_t points, std::size_t parts) const {
    if (channel.is_whole()) return {channel_way::whole, 0};
    const auto length = static_cast<double>(points);
    const double ratio = channel.ratio.value(), band = ratio * length, overlap = length / static_cast<double>(parts);
    if (width_ / ((1 - channel.passband) * ratio / 2) <= overlap) {
      const wide_unsigned samples = channel.ratio.up() * points;
      const wide_unsigned granule = 2 * wide_unsigned{parts};
      if (samples % channel.ratio.down() == 0 && samples / channel.ratio.down() % granule == 0)
        return {channel_way::exact, static_cast<std::size_t>(samples / channel.ratio.down())};
      return {channel_way::interpolated, fast_multiple(2 * band, 2 * parts)};
    }
    const std::size_t least = fast_multiple(band + 2 * width_ * static_cast<double>(parts) + 2, 2 * parts);
    return {channel_way::coarse, 2 * least <= points ? least : 0};
  }

  std::span<const channel_request> channels_;
  double width_;
};

/// Lengths of blocks that are tried, in ascending order.
std::vector<std::size_t> lengths_of_blocks(std::size_t common) {
  std::vector<std::size_t> lengths;
  for (const std::size_t factor : {1U, 3U, 5U})
    for (std::size_t length = common * factor; length <= most_points; length *= 2)
      if (length >= least_points) lengths.push_back(length);
  std::sort(lengths.begin(), lengths.end());
  return lengths;
}

}  // namespace

channel_plan plan_channels(std::span<const channel_request> channels, double rejection) {
  constexpr double good_enough = 1.05;
  const planner plans(channels, rejection);
  const std::vector<std::size_t> lengths = lengths_of_blocks(common_length(channels));
  std::vector<channel_step> steps;
  double cheapest = std::numeric_limits<double>::infinity();
  for (const std::size_t points : lengths)
    for (const std::size_t parts : overlaps)
      if (points % (2 * parts) == 0) cheapest = std::min(cheapest, plans.choose(points, parts, steps));
  for (const std::size_t points : lengths)
    for (const std::size_t parts : overlaps)
      if (points % (2 * parts) == 0 && plans.choose(points, parts, steps) <= good_enough * cheapest)
        return {points, points / parts, steps};
  return {};
}

}  // namespace dsp
