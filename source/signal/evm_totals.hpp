// The sums of error vectors over blocks, and what follows from them. SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cstdint>

#include "signal/evm_comparison.hpp"
#include "signal/exact_sum.hpp"

namespace dsp {

/// Positions in a stream from `first` to `last`, not included.
struct positions {
  std::uint64_t first, last;
  [[nodiscard]] std::uint64_t count() const noexcept { return last - first; }
};

/// A stream is compared block by block, whose borders are at multiples of `length` from its position 0, with its
/// neighbours in a window of `window` samples as far as the record has them: nothing depends on cuts.
struct error_block {
  static constexpr std::uint64_t margin = 8192, window = delayed_reference<std::complex<float>>::longest,
                                 length = window - 2 * margin;

  positions inner, around;  // of the block, and of its window

  static std::uint64_t window_begin(std::uint64_t block) noexcept { return block == 0 ? 0 : block * length - margin; }
  /// The block with that number, as far as a record goes.
  error_block(std::uint64_t block, const positions &record) noexcept;
  [[nodiscard]] stretch part() const noexcept {
    return {static_cast<std::size_t>(inner.first - around.first), static_cast<std::size_t>(inner.last - around.first)};
  }
};

struct error_figures {
  positions compared{0, 0};
  stream_model model;
  double reference_rms = 0;
  double rms = 0, magnitude_rms = 0, phase_rms = 0;  // of the reference's RMS, and radians
  power_peak peak;                                   // square of the largest error, position in the record
};

enum class error_outcome { measured, silent_reference, unrelated, undetermined };

/// A better model, and where it goes.
struct model_refinement {
  stream_model model;
  bool settled = true;    // no other round is needed
  double reach = 0x1p62;  // samples around and with these, over which the model can be refined next
  double reference_rms = 0;
};

/// Sets what is wanted of the model from sums over `samples`, by one step; the change is that step. Refuses where
/// streams that were `searched` over, or whose gain is wanted, have nothing in common.
error_outcome fit_model(const stream_moments &sums, double samples, const alignment &wanted, bool searched,
                        stream_model &model, model_change &change);

/// Sums over blocks under one model, exact: their order does not matter.
class error_totals {
 public:
  void add(const block_sums &block) noexcept;
  void add(const error_totals &other) noexcept;

  /// Of a record whose samples are all in; not where none is compared.
  error_outcome read(const positions &compared, const stream_model &model, error_figures &figures) const noexcept;
  error_outcome refine(const positions &record, const positions &compared, const alignment &wanted,
                       const stream_model &model, model_refinement &refined) const;

  static constexpr std::size_t sum_count = stream_moments::count + 3;
  struct image {
    power_peak peak;
    std::array<exact_sum::image, sum_count> sums;
  };
  [[nodiscard]] image save() const noexcept;
  /// False for what no totals save.
  [[nodiscard]] bool load(const image &saved) noexcept;

 private:
  [[nodiscard]] stream_moments moments() const noexcept;

  std::array<exact_sum, sum_count> sums_;  // moments, then squares of errors, magnitudes, phases
  power_peak peak_;
};

/// Samples of a record whose reference is known where the model delays it.
positions known_positions(const positions &record, double delay) noexcept;

}  // namespace dsp
