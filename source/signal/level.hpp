// Levels of a stream: an accumulator, and shares of powers of a record. SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <complex>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "signal/exact_sum.hpp"
#include "signal/level_figures.hpp"
#include "signal/power_histogram.hpp"

namespace dsp {

/// The largest power so far and where it first is; NaN counts as larger than any number.
struct power_peak {
  double power = -1;
  std::uint64_t position = 0;
  void take(double other, std::uint64_t at) noexcept;
  /// Powers from a position on, whose sum and largest are known; the latter counts where there is no NaN.
  void take(std::span<const double> powers, double sum, double largest, std::uint64_t at) noexcept;
};

/// What is known of samples wherever they stand in a stream.
class level_totals {
 public:
  /// Adds samples of one block from a position on, all but their sums, which are returned.
  template <class Sample>
  run_figures add(std::span<const Sample> x, std::uint64_t position) noexcept;
  /// Adds the sums of a complete block.
  void add_sums(const run_figures &block) noexcept;
  void add(const level_totals &other) noexcept;
  void clear() noexcept;

  power_peak peak;
  std::array<exact_sum, 3> sums;  // of complete blocks: power, I, Q
  power_histogram powers;
};

/// Levels of samples of one type from a position on. The stream is summed block by block, whose borders are at
/// multiples of level_block from its position 0, and the blocks' sums exactly: nothing depends on cuts, merges and
/// threads. Samples of incomplete blocks at both ends are kept.
template <class Sample>
class level_meter {
 public:
  /// Uses so many threads at most; 0 for as many as pay. Throws std::bad_alloc, as nothing else here does but copies of
  /// the kept samples.
  level_meter(std::uint64_t start, std::size_t threads);

  void add(std::span<const Sample> x) noexcept;
  /// `next` begins where this one ends.
  void merge(const level_meter &next) noexcept;

  [[nodiscard]] std::uint64_t start() const noexcept { return start_; }
  [[nodiscard]] std::uint64_t samples() const noexcept { return samples_; }
  [[nodiscard]] const power_peak &peak() const noexcept { return totals_.peak; }
  [[nodiscard]] const power_histogram &powers() const noexcept { return totals_.powers; }

  struct means {
    double power;
    std::complex<double> dc;
  };
  /// Of at least one sample.
  [[nodiscard]] means mean() const noexcept;

  /// For each level in decibels, the share of samples whose power is more than that above the mean, as the histogram
  /// tells. Of at least one sample.
  void read_shares(std::span<const double> above_db, double *share) const noexcept;

  /// What a state holds beside start, number of samples and the histogram's octaves.
  struct image {
    power_peak peak;
    std::array<exact_sum::image, 3> sums;
  };
  [[nodiscard]] image save() const noexcept;
  [[nodiscard]] std::span<const Sample> head() const noexcept { return {head_.data(), head_count()}; }
  [[nodiscard]] std::span<const Sample> tail() const noexcept { return {tail_.data(), tail_count()}; }

  /// Continues from an image; the kept samples and the histogram are then filled in. False for what no meter saves.
  [[nodiscard]] bool load(std::uint64_t samples, const image &saved) noexcept;
  std::span<Sample> head() noexcept { return {head_.data(), head_count()}; }
  std::span<Sample> tail() noexcept { return {tail_.data(), tail_count()}; }
  power_histogram &powers() noexcept { return totals_.powers; }

 private:
  [[nodiscard]] std::size_t head_count() const noexcept;
  [[nodiscard]] std::size_t tail_count() const noexcept;
  void add_alone(std::span<const Sample> x) noexcept;
  /// Adds complete blocks.
  void add_shared(std::span<const Sample> blocks) noexcept;
  /// Adds samples of one block to the sums where they are all of it, which then have the figures, or to the kept ones.
  void keep(std::span<const Sample> x, const run_figures &figures) noexcept;

  std::uint64_t start_, samples_ = 0;
  level_totals totals_;
  std::vector<level_totals> others_;  // of the threads beside the caller's, empty between calls
  std::vector<Sample> head_, tail_;   // room for a block: samples in front of the first border, and behind the last
};

/// The same of a record, exactly. Throws std::bad_alloc.
template <class Sample>
void share_above(std::span<const Sample> x, std::span<const double> above_db, double *share);

}  // namespace dsp
