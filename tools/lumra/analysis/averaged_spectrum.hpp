// The averaged power spectrum of a recording of any length in constant memory. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <lumra/lumra.hpp>
#include <vector>

#include "recording/source.hpp"

namespace tool {

struct spectrum_settings {
  lumra::window window = lumra::window::flat_top;
  std::int32_t fft_size = 0;
  double overlap_percent = 50;
  std::uint64_t block = std::uint64_t{1} << 20;  // samples to read at a time; the result does not depend on it
};

/// Bin k lies (k - N / 2) * df from the centre frequency, for odd N too: zero lies between two bins then.
struct averaged_spectrum {
  std::vector<double> power;   // a tone on a bin with full-scale amplitude has 1
  double df = 0;               // bin spacing in hertz
  double noise_bandwidth = 0;  // of the window, in bins
  std::uint64_t segments = 0;

  [[nodiscard]] double offset(std::size_t bin) const noexcept {
    return (static_cast<double>(bin) - static_cast<double>(power.size()) / 2) * df;
  }
  [[nodiscard]] double resolution_bandwidth() const noexcept { return noise_bandwidth * df; }
};

/// Level of a power relative to full scale; powers below 1e-30, zero among them, count as -300 dB.
double decibels(double power) noexcept;

/// The segments are those of one library call on the whole recording; their powers are averaged over the blocks in
/// double precision. Throws failure, or lumra::error when the library refuses.
averaged_spectrum average_spectrum(const recording::source &source, const recording::stretch &over,
                                   const spectrum_settings &settings);

}  // namespace tool
