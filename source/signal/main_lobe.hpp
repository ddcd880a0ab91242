// The main lobe of a window's transform, and tones found by it. SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

#include "signal/cosine_window.hpp"
#include "signal/window.hpp"

namespace dsp {

/// The transform of a periodic window of `points` values, 16 or more, in bins around 0.
class main_lobe {
 public:
  main_lobe(const window_shape &shape, std::uint64_t points) noexcept;

  /// From the middle to the first zero, in bins.
  [[nodiscard]] double half_width() const noexcept { return half_width_; }

  /// Magnitude relative to the middle, up to 2 bins from it. Cosine sums are exact; Kaiser's window is the transform of
  /// the continuous window with the aliases of the steps at its ends.
  [[nodiscard]] double magnitude(double bins) const noexcept;

  /// A tone beside a bin.
  struct tone {
    double offset;  // in bins, -0.5 to 0.5
    double gain;    // of its power over the bin's
  };
  /// From the powers of three neighbouring bins, the middle one the highest.
  [[nodiscard]] tone interpolate(double below, double middle, double above) const noexcept;

  /// The most that a tone's power can be above its highest bin's.
  [[nodiscard]] double largest_gain() const noexcept { return largest_gain_; }

 private:
  [[nodiscard]] double cosine_sum_at(double bins, double sine) const noexcept;
  [[nodiscard]] double kaiser_at(double bins) const noexcept;
  [[nodiscard]] double slope_figure(double offset) const noexcept;

  const cosine_sum *sum_;  // null for Kaiser's window
  double beta_, count_, half_width_, end_ = 0, middle_ = 1, largest_gain_ = 1;
  std::array<double, sizeof(cosine_sum::a) / sizeof(double)> tangents_{};
};

}  // namespace dsp
