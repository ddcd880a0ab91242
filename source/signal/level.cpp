// SPDX-License-Identifier: MIT
#include "signal/level.hpp"

#include <algorithm>
#include <atomic>
#include <cmath>
#include <limits>
#include <numeric>

#include "signal/workers.hpp"

namespace dsp {
namespace {

/// Samples that are worth a second thread, which takes as long to come and to be merged as some ten thousand; and how
/// many a thread takes at a time.
constexpr std::size_t worth_threads = std::size_t{1} << 16, turn = std::size_t{1} << 14;

/// Of the threads that are wanted, those that have a processor.
std::size_t useful_threads(std::size_t wanted) noexcept {
  return std::min(thread_count(wanted), thread_count(0));
}

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

void power_peak::take(std::span<const double> powers, double sum, double largest, std::uint64_t at) noexcept {
  if (std::isnan(sum)) {
    for (std::size_t k = 0; k < powers.size(); ++k) take(powers[k], at + k);
  } else if (largest >= power) {
    const auto first = std::find(powers.begin(), powers.end(), largest);
    take(largest, at + static_cast<std::uint64_t>(first - powers.begin()));
  }
}

template <class Sample>
run_figures level_totals::add(std::span<const Sample> x, std::uint64_t position) noexcept {
  std::array<double, level_block> room;
  const run_figures figures = measure_run(x.data(), x.size(), room.data());
  const std::span<const double> each(room.data(), x.size());
  if (std::isnan(figures.power))
    powers.add(each, 0, figures.power);
  else
    powers.add(each, figures.smallest, figures.largest);
  peak.take(each, figures.power, figures.largest, position);
  return figures;
}

void level_totals::add_sums(const run_figures &block) noexcept {
  sums[0].add(block.power);
  sums[1].add(block.dc_re);
  sums[2].add(block.dc_im);
}

void level_totals::add(const level_totals &other) noexcept {
  peak.take(other.peak.power, other.peak.position);
  for (std::size_t k = 0; k < sums.size(); ++k) sums[k].add(other.sums[k]);
  powers.add(other.powers);
}

void level_totals::clear() noexcept {
  peak = {};
  sums = {};
  powers.clear();
}

template <class Sample>
level_meter<Sample>::level_meter(std::uint64_t start, std::size_t threads)
    : start_(start), others_(useful_threads(threads) - 1), head_(level_block), tail_(level_block) {}

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
void level_meter<Sample>::keep(std::span<const Sample> x, const run_figures &figures) noexcept {
  const std::size_t kept = tail_count();
  if (x.size() == level_block) {
    totals_.add_sums(figures);
  } else if (start_ % level_block != 0 && samples_ < level_block - start_ % level_block) {
    std::copy(x.begin(), x.end(), head_.begin() + static_cast<std::ptrdiff_t>(samples_));
  } else {
    std::copy(x.begin(), x.end(), tail_.begin() + static_cast<std::ptrdiff_t>(kept));
    std::array<double, level_block> powers;
    if (kept + x.size() == level_block) totals_.add_sums(measure_run(tail_.data(), level_block, powers.data()));
  }
  samples_ += x.size();
}

template <class Sample>
void level_meter<Sample>::add(std::span<const Sample> x) noexcept {
  if (!others_.empty() && x.size() >= worth_threads) {
    const auto to_border = static_cast<std::size_t>(-(start_ + samples_) % level_block);
    add_alone(x.first(to_border));
    x = x.subspan(to_border);
    const std::size_t whole = x.size() - x.size() % level_block;
    add_shared(x.first(whole));
    x = x.subspan(whole);
  }
  add_alone(x);
}

template <class Sample>
void level_meter<Sample>::add_alone(std::span<const Sample> x) noexcept {
  while (!x.empty()) {
    const std::uint64_t position = start_ + samples_;
    const auto run = x.first(std::min<std::size_t>(x.size(), level_block - position % level_block));
    keep(run, totals_.add(run, position));
    x = x.subspan(run.size());
  }
}

template <class Sample>
void level_meter<Sample>::add_shared(std::span<const Sample> blocks) noexcept {
  const std::uint64_t position = start_ + samples_;
  std::atomic<std::size_t> next{0};
  run_parts(others_.size() + 1, [&](std::size_t part) {
    level_totals &own = part == 0 ? totals_ : others_[part - 1];
    for (std::size_t first = next.fetch_add(turn); first < blocks.size(); first = next.fetch_add(turn)) {
      const std::size_t end = std::min(first + turn, blocks.size());
      for (std::size_t k = first; k < end; k += level_block)
        own.add_sums(own.add(blocks.subspan(k, level_block), position + k));
    }
  });
  for (level_totals &other : others_) {
    if (other.peak.power == -1) continue;  // came too late
    totals_.add(other);
    other.clear();
  }
  samples_ += blocks.size();
}

template <class Sample>
void level_meter<Sample>::merge(const level_meter &next) noexcept {
  // The border's block comes from what both kept; all else of `next` is in its totals.
  const std::uint64_t samples = samples_ + next.samples_;
  const std::span<const Sample> head = next.head(), tail = next.tail();
  if (!head.empty()) keep(head, {});
  samples_ = samples - tail.size();
  if (!tail.empty()) keep(tail, {});
  totals_.add(next.totals_);
}

template <class Sample>
typename level_meter<Sample>::means level_meter<Sample>::mean() const noexcept {
  auto [power, re, im] = totals_.sums;
  std::array<double, level_block> powers;
  for (const auto kept : {head(), tail()}) {
    if (kept.empty()) continue;
    const run_figures figures = measure_run(kept.data(), kept.size(), powers.data());
    power.add(figures.power);
    re.add(figures.dc_re);
    im.add(figures.dc_im);
  }
  const auto count = static_cast<double>(samples_);
  return {power.value() / count, {re.value() / count, im.value() / count}};
}

template <class Sample>
void level_meter<Sample>::read_shares(std::span<const double> above_db, double *share) const noexcept {
  const double power = mean().power;
  for (std::size_t k = 0; k < above_db.size(); ++k) {
    const double threshold = power_above(power, above_db[k]);
    share[k] =
        std::isnan(threshold) ? threshold : totals_.powers.count_above(threshold) / static_cast<double>(samples_);
  }
}

template <class Sample>
typename level_meter<Sample>::image level_meter<Sample>::save() const noexcept {
  return {totals_.peak, {totals_.sums[0].save(), totals_.sums[1].save(), totals_.sums[2].save()}};
}

template <class Sample>
bool level_meter<Sample>::load(std::uint64_t samples, const image &saved) noexcept {
  samples_ = samples;
  const power_peak &peak = totals_.peak = saved.peak;
  for (std::size_t k = 0; k < totals_.sums.size(); ++k)
    if (!totals_.sums[k].load(saved.sums[k])) return false;
  if (samples == 0) return peak.power == -1 && peak.position == 0;
  return !(peak.power < 0) && peak.position >= start_ && peak.position - start_ < samples;
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
