// SPDX-License-Identifier: MIT
#include "signal/level.hpp"

#include <algorithm>
#include <cmath>
#include <limits>
#include <numeric>

namespace dsp {
namespace {

double power_above(double power, double db) noexcept {
  return power * std::pow(10.0, db / 10);
}

}  // namespace

void power_peak::take(double other, std::uint64_t at) noexcept {
  const bool larger = std::isnan(other) ? !std::isnan(power) : other > power;
  const bool same = other == power || (std::isnan(other) && std::isnan(power));
  if (!larger && !(same && at < position)) return;
  power = other;
  position = at;
}

template <class Sample>
level_meter<Sample>::level_meter(std::uint64_t start) : start_(start), head_(level_block), tail_(level_block) {}

template <class Sample>
std::size_t level_meter<Sample>::head_count() const noexcept {
  const std::uint64_t to_border = (level_block - start_ % level_block) % level_block;
  return static_cast<std::size_t>(std::min(to_border, samples_));
}

template <class Sample>
std::size_t level_meter<Sample>::tail_count() const noexcept {
  return static_cast<std::size_t>((samples_ - head_count()) % level_block);
}

template <class Sample>
void level_meter<Sample>::add_run(block_sums &sums, const run_figures &figures) noexcept {
  sums[0].add(figures.power);
  sums[1].add(figures.dc_re);
  sums[2].add(figures.dc_im);
}

template <class Sample>
void level_meter<Sample>::keep(std::span<const Sample> x, const run_figures &figures) noexcept {
  const std::size_t kept = tail_count();
  if (x.size() == level_block) {
    add_run(sums_, figures);
  } else if (start_ % level_block != 0 && samples_ < level_block - start_ % level_block) {
    std::copy(x.begin(), x.end(), head_.begin() + static_cast<std::ptrdiff_t>(samples_));
  } else {
    std::copy(x.begin(), x.end(), tail_.begin() + static_cast<std::ptrdiff_t>(kept));
    std::array<double, level_block> powers;
    if (kept + x.size() == level_block) add_run(sums_, measure_run(tail_.data(), level_block, powers.data()));
  }
  samples_ += x.size();
}

template <class Sample>
void level_meter<Sample>::add(std::span<const Sample> x) noexcept {
  std::array<double, level_block> room;
  while (!x.empty()) {
    const std::uint64_t position = start_ + samples_;
    const std::size_t count = std::min<std::size_t>(x.size(), level_block - position % level_block);
    const run_figures figures = measure_run(x.data(), count, room.data());
    const std::span<const double> powers(room.data(), count);
    if (std::isnan(figures.power)) {
      powers_.add(powers, 0, figures.power);
      for (std::size_t k = 0; k < count; ++k) peak_.take(powers[k], position + k);
    } else {
      powers_.add(powers, figures.smallest, figures.largest);
      if (figures.largest > peak_.power) {
        const auto first = std::find(powers.begin(), powers.end(), figures.largest);
        peak_.take(figures.largest, position + static_cast<std::uint64_t>(first - powers.begin()));
      }
    }
    keep(x.first(count), figures);
    x = x.subspan(count);
  }
}

template <class Sample>
void level_meter<Sample>::merge(const level_meter &next) noexcept {
  // The border's block comes from what both kept; all else of `next` is in its sums.
  const std::uint64_t samples = samples_ + next.samples_;
  const std::span<const Sample> head = next.head(), tail = next.tail();
  if (!head.empty()) keep(head, {});
  samples_ = samples - tail.size();
  if (!tail.empty()) keep(tail, {});
  for (std::size_t k = 0; k < sums_.size(); ++k) sums_[k].add(next.sums_[k]);
  if (next.samples_ != 0) peak_.take(next.peak_.power, next.peak_.position);
  powers_.add(next.powers_);
}

template <class Sample>
typename level_meter<Sample>::means level_meter<Sample>::mean() const noexcept {
  block_sums sums = sums_;
  std::array<double, level_block> powers;
  for (const auto kept : {head(), tail()})
    if (!kept.empty()) add_run(sums, measure_run(kept.data(), kept.size(), powers.data()));
  const auto count = static_cast<double>(samples_);
  return {sums[0].value() / count, {sums[1].value() / count, sums[2].value() / count}};
}

template <class Sample>
void level_meter<Sample>::read_shares(std::span<const double> above_db, double *share) const noexcept {
  const double power = mean().power;
  for (std::size_t k = 0; k < above_db.size(); ++k) {
    const double threshold = power_above(power, above_db[k]);
    share[k] = std::isnan(threshold) ? threshold : powers_.count_above(threshold) / static_cast<double>(samples_);
  }
}

template <class Sample>
typename level_meter<Sample>::image level_meter<Sample>::save() const noexcept {
  return {peak_, {sums_[0].save(), sums_[1].save(), sums_[2].save()}};
}

template <class Sample>
bool level_meter<Sample>::load(std::uint64_t samples, const image &saved) noexcept {
  samples_ = samples;
  peak_ = saved.peak;
  for (std::size_t k = 0; k < sums_.size(); ++k)
    if (!sums_[k].load(saved.sums[k])) return false;
  if (samples == 0) return peak_.power == -1 && peak_.position == 0;
  return !(peak_.power < 0) && peak_.position >= start_ && peak_.position - start_ < samples;
}

template <class Sample>
void share_above(std::span<const Sample> x, std::span<const double> above_db, double *share) {
  std::array<double, level_block> powers;
  exact_sum total;
  const auto for_each_run = [&](auto visit) {
    for (std::size_t k = 0; k < x.size(); k += level_block) {
      const std::size_t n = std::min(x.size() - k, level_block);
      visit(measure_run(x.data() + k, n, powers.data()), n);
    }
  };
  for_each_run([&](const run_figures &figures, std::size_t) { total.add(figures.power); });
  const auto count = static_cast<double>(x.size());
  const double mean = total.value() / count;

  // Powers are counted between the thresholds in ascending order, then the counts are summed from above.
  std::vector<double> thresholds(above_db.size());
  for (std::size_t k = 0; k < thresholds.size(); ++k) thresholds[k] = power_above(mean, above_db[k]);
  std::vector<double> ascending = thresholds;
  std::erase_if(ascending, [](double t) { return std::isnan(t); });
  std::sort(ascending.begin(), ascending.end());
  std::vector<std::uint64_t> above(ascending.size() + 1);
  for_each_run([&](const run_figures &, std::size_t n) {
    for (std::size_t k = 0; k < n; ++k)
      ++above[static_cast<std::size_t>(std::lower_bound(ascending.begin(), ascending.end(), powers[k]) -
                                       ascending.begin())];
  });
  std::partial_sum(above.rbegin(), above.rend(), above.rbegin());
  for (std::size_t k = 0; k < thresholds.size(); ++k) {
    const auto at = std::lower_bound(ascending.begin(), ascending.end(), thresholds[k]) - ascending.begin();
    share[k] = std::isnan(thresholds[k]) ? std::numeric_limits<double>::quiet_NaN()
                                         : static_cast<double>(above[static_cast<std::size_t>(at) + 1]) / count;
  }
}

#define LEVELS(SAMPLE)                \
  template class level_meter<SAMPLE>; \
  template void share_above(std::span<const SAMPLE>, std::span<const double>, double *);
LEVELS(float)
LEVELS(double)
LEVELS(std::complex<float>)
LEVELS(std::complex<double>)
#undef LEVELS

}  // namespace dsp
