// Error vectors of streams of any length under a model. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstdint>
#include <span>
#include <vector>

#include "signal/evm_totals.hpp"

namespace dsp {

/// Compares the samples of two streams from a position on. Nothing depends on cuts and merges: complete blocks are in
/// the sums; samples of the others, and of windows, are kept at both ends.
template <class Real>
class evm_meter {
 public:
  using sample = std::complex<Real>;

  /// Throws std::bad_alloc, dfti_failure.
  evm_meter(std::uint64_t start, const alignment &wanted, const stream_model &model);

  /// Adds as many samples of both streams. Throws std::bad_alloc, dfti_failure where the FFT fails.
  void add(std::span<const sample> reference, std::span<const sample> measured);
  /// `next` begins where this one ends, and has the same model. Throws as add does.
  void merge(const evm_meter &next);

  [[nodiscard]] positions record() const noexcept { return {start_, end_}; }
  [[nodiscard]] const alignment &wanted() const noexcept { return wanted_; }
  [[nodiscard]] const stream_model &model() const noexcept { return comparison_.model(); }
  /// The samples that are compared.
  [[nodiscard]] positions compared() const noexcept;

  /// Where some are compared. Throw as add does.
  error_outcome read(error_figures &figures) const;
  error_outcome refine(model_refinement &refined) const;

  /// Samples of both streams that are kept, as many.
  struct kept {
    std::vector<sample> reference, measured;
  };
  [[nodiscard]] const kept &head() const noexcept { return head_; }
  [[nodiscard]] const kept &tail() const noexcept { return tail_; }
  [[nodiscard]] error_totals::image save() const noexcept { return totals_.save(); }
  /// Continues with so many samples from an image; the kept samples have their sizes and are then filled in. False for
  /// what no meter saves.
  [[nodiscard]] bool load(std::uint64_t samples, const error_totals::image &saved);
  kept &head() noexcept { return head_; }
  kept &tail() noexcept { return tail_; }

 private:
  /// Positions whose samples are kept, before the first complete block and behind the last.
  [[nodiscard]] positions head_place() const noexcept;
  [[nodiscard]] positions tail_place() const noexcept;
  /// The totals with the blocks that are not complete.
  [[nodiscard]] error_totals all() const;

  std::uint64_t start_, end_;
  alignment wanted_;
  std::uint64_t first_block_;  // the first whose window lies behind the start
  std::uint64_t next_block_;   // the first that is not in the totals
  block_comparison<Real> comparison_;
  error_totals totals_;
  kept head_, tail_;
};

}  // namespace dsp
