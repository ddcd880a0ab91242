// How often powers occur, in bins that are fine in decibels. SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>

#include "platform/pages.hpp"

namespace dsp {

/// Counts of powers, 512 bins an octave: the leading bits of a double, so that a bin is at most 0.0085 dB wide. The
/// first bin is that of 0. The memory is asked for at once but used, page by page, only for octaves that occur.
class power_histogram {
 public:
  static constexpr std::size_t octaves = 2048, bins_in_octave = 512;

  /// Throws std::bad_alloc.
  power_histogram() : counts_(octaves * bins_in_octave * sizeof(std::uint64_t)) {}

  /// Powers that are not negative, all between smallest and largest; or NaN, which counts in a bin of its own.
  void add(std::span<const double> power, double smallest, double largest) noexcept;
  void add(const power_histogram &other) noexcept;
  void clear() noexcept;

  /// How many lie above a power, as if those of a bin were spread evenly in it.
  [[nodiscard]] double count_above(double power) const noexcept;

  /// The octaves that hold anything, in ascending order.
  template <class Visit>
  void visit_octaves(Visit visit) const {
    for (std::size_t octave = 0; octave < octaves; ++octave)
      if (used_[octave]) visit(octave, std::span<const std::uint64_t, bins_in_octave>(bins_of(octave), bins_in_octave));
  }
  /// To be filled with what an octave held.
  std::span<std::uint64_t, bins_in_octave> refill(std::size_t octave) noexcept {
    used_[octave] = true;
    return std::span<std::uint64_t, bins_in_octave>(bins_of(octave), bins_in_octave);
  }

 private:
  [[nodiscard]] std::uint64_t *bins_of(std::size_t octave) const noexcept {
    return static_cast<std::uint64_t *>(counts_.data()) + octave * bins_in_octave;
  }

  platform::zero_pages counts_;
  std::array<bool, octaves> used_{};
};

}  // namespace dsp
