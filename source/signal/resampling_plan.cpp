// SPDX-License-Identifier: MIT
#include "signal/resampling_plan.hpp"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <numeric>
#include <utility>

namespace dsp {
namespace {

/// Factors by which steps with wide transitions change the rate.
constexpr unsigned wide_steps[] = {2,  3,  4,  5,  6,  7,  8,  9,  10, 12, 14, 15,
                                   16, 18, 20, 24, 25, 27, 28, 30, 32, 40, 48, 64};
/// Ratios from which on one such step is taken for granted: one that divides, from the last ones.
constexpr double far = 64;
constexpr unsigned usual_far_step = 32;

/// What remains to be done, with frequencies in cycles per input sample.
struct goal {
  rate_ratio ratio;
  double pass, half;  // of the pass band, and of the lower of the whole conversion's rates
  double spare;       // nanoseconds for an input sample that shorter blocks are worth, for they hold less back
};

class planner {
 public:
  explicit planner(double attenuation) noexcept : attenuation_(attenuation) {}

  [[nodiscard]] std::optional<resampling_plan> best(const goal &wanted) const {
    const double ratio = wanted.ratio.value();
    if (ratio < 1 / far) return decimating(wanted, far_step(wanted.ratio.down()), &planner::best);
    result cheapest;
    if (ratio > far && divides(far_step(wanted.ratio.up()), wanted.ratio.up()))
      cheapest = expanding(wanted, far_step(wanted.ratio.up()), &planner::best);
    if (cheapest) return cheapest;
    cheapest = narrow(wanted);
    for (const unsigned factor : wide_steps) {
      if (ratio * factor <= 0.5) take_cheaper(cheapest, decimating(wanted, factor, &planner::narrow));
      if (ratio >= 2.0 * factor && divides(factor, wanted.ratio.up()))
        take_cheaper(cheapest, expanding(wanted, factor, &planner::narrow));
    }
    return cheapest;
  }

 private:
  using result = std::optional<resampling_plan>;
  using method = result (planner::*)(const goal &) const;

  static bool divides(unsigned factor, wide_unsigned term) noexcept { return term % factor == 0; }
  static unsigned far_step(wide_unsigned term) noexcept {
    for (auto step = std::rbegin(wide_steps); *step >= usual_far_step / 2; ++step)
      if (*step <= usual_far_step && divides(*step, term)) return *step;
    return usual_far_step;
  }
  static void take_cheaper(result &cheapest, result other) {
    if (other && (!cheapest || other->cost < cheapest->cost)) cheapest = std::move(other);
  }

  /// Behind a block, what `last` gives; the cost counts at the block's input.
  static result chain(const std::optional<block_design> &first, const result &last) {
    if (!first || !last) return std::nullopt;
    resampling_plan all{{*first}, last->rest, first->cost};
    all.cost += last->cost * static_cast<double>(first->up) / static_cast<double>(first->down);
    all.blocks.insert(all.blocks.end(), last->blocks.begin(), last->blocks.end());
    return all;
  }

  [[nodiscard]] std::optional<block_design> block(std::size_t up, std::size_t down, double pass, double stop,
                                                  double spare) const {
    return design_block(up, down, {pass, stop, attenuation_}, spare);
  }

  /// One step with the narrow transition, at the exact ratio or for an interpolator.
  [[nodiscard]] result narrow(const goal &wanted) const {
    result cheapest;
    const wide_unsigned up = wanted.ratio.up(), down = wanted.ratio.down();
    if (std::max(up, down) <= longest_resampling_block)
      cheapest = chain(
          block(static_cast<std::size_t>(up), static_cast<std::size_t>(down), wanted.pass, wanted.half, wanted.spare),
          resampling_plan{});
    // An interpolator's input has four times the half of the lower rate, or a little more.
    const double cost = 0.27 * attenuation_;  // nanoseconds for an output
    for (std::size_t b = 1; b <= 8; ++b) {
      const auto a = static_cast<std::size_t>(std::ceil(4 * wanted.half * static_cast<double>(b)));
      if (std::gcd(a, b) != 1) continue;
      const rate_ratio rest = wanted.ratio.times(b, a);
      take_cheaper(cheapest, chain(block(a, b, wanted.pass, wanted.half, wanted.spare),
                                   resampling_plan{{}, rest, cost * rest.value()}));
    }
    return cheapest;
  }

  /// To an input rate that is lower by the factor, and from there by a method.
  [[nodiscard]] result decimating(const goal &wanted, unsigned factor, method then) const {
    const auto first = block(1, factor, wanted.pass, 0.5 / factor, wanted.spare);
    return chain(first, (this->*then)({wanted.ratio.times(factor, 1), wanted.pass * factor, wanted.half * factor,
                                       wanted.spare * factor}));
  }

  /// By a method to an output rate that is lower by the factor, and from there to the wanted one.
  [[nodiscard]] result expanding(const goal &wanted, unsigned factor, method first) const {
    const rate_ratio inner = wanted.ratio.times(1, factor);
    auto plan = (this->*first)({inner, wanted.pass, wanted.half, wanted.spare});
    const auto last = block(factor, 1, wanted.pass / inner.value(), 0.5, wanted.spare / inner.value());
    if (!plan || plan->rest || !last) return std::nullopt;
    plan->blocks.push_back(*last);
    plan->cost += last->cost * inner.value();
    return plan;
  }

  double attenuation_;
};

}  // namespace

resampling_plan plan_resampling(const rate_ratio &ratio, double passband, double rejection) {
  // The margin is for what the low pass of a block lacks to Kaiser's formula and for what ends of blocks add. Where
  // little rejection is wanted, ripples of all steps together stay below 0.01 dB nevertheless.
  constexpr double margin = 10, least = 70, spare = 0.05;
  if (ratio.is_one()) return {};
  const double half = std::min(1.0, ratio.value()) / 2;
  const double kept = std::max(rejection, least);
  resampling_plan plan = planner(kept + margin).best({ratio, passband * half, half, spare}).value();
  plan.rejection = kept;
  return plan;
}

}  // namespace dsp
