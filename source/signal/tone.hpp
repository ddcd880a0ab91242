// A carrier of a power spectrum with what is beside it. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <span>

#include "signal/main_lobe.hpp"
#include "signal/spectrum_figures.hpp"

namespace dsp {

/// Powers are linear; NaN where there is none.
struct tone_figures {
  double frequency;  // in hertz
  double carrier;
  double noise;                 // of the whole band
  double noise_and_distortion;  // of all but carrier and 0 Hz
  double harmonics;             // those that could be told from other lines
  double spur;                  // the strongest line but carrier and 0 Hz
  double spur_frequency;        // its bin's
  double image;
  double dc;
};

struct harmonic {
  double frequency;  // in hertz
  double power;      // NaN where it falls on another line
};

/// Measures the strongest line outside of 0 Hz, or the one nearest to a frequency in the band, and its harmonics from
/// order 2 on.
[[nodiscard]] tone_figures measure_tone(const spectrum_view &spectrum, const main_lobe &lobe,
                                        std::optional<double> near, std::span<harmonic> harmonics);

}  // namespace dsp
