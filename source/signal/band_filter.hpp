// The low pass of a band, as transforms apply it. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <span>

#include "signal/filter_design.hpp"

namespace dsp {

/// The gain is flat up to one frequency, and rejected from another one on.
struct band_edges {
  double pass, stop;  // in cycles per sample, 0 <= pass < stop
};

/// A sinc under Kaiser's window in continuous time: its response is known at every frequency, and beyond its length
/// there is nothing, so that blocks that overlap by its length have no error but that of the bins that are left out.
class band_filter {
 public:
  /// The length in samples that a transition of one cycle per sample takes; others take inversely more.
  static double length_of_transition(double rejection) noexcept { return design(rejection).width; }

  /// Rejection in dB.
  band_filter(const band_edges &edges, double rejection) noexcept;

  /// In samples, from end to end.
  [[nodiscard]] double length() const noexcept { return length_; }
  /// Gains at first + k step cycles per sample; a step is at most half a cycle in the filter's length.
  void make_gains(double first, double step, std::span<double> gains) const noexcept;

  /// What the gain of a pass band differs from 1 by at most, in dB.
  static double ripple(double rejection) noexcept;

 private:
  // Below the least attenuation several filters in a row would have ripples of more than 0.01 dB. Bins beyond the stop
  // edge are left out: what that adds to the window's ripples is in the margin.
  static constexpr double least_attenuation = 74, margin = 8;
  static kaiser_formulas design(double rejection) noexcept {
    return kaiser_formulas(std::max(rejection + margin, least_attenuation));
  }
  [[nodiscard]] double window_response(double frequency) const noexcept;
  [[nodiscard]] double integral(double from, double to) const noexcept;

  double edge_, length_, beta_, scale_;
};

}  // namespace dsp
