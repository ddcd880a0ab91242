// Figures of power spectra over spans; see measure.h. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/measure.h>
#include <lumra/error.hpp>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

namespace lumra {

using adjacent = lumra_adjacent;
using harmonic = lumra_harmonic;
using peak = lumra_peak;

struct frequency_band {
  double low_hz, high_hz;
};

struct tone_figures : lumra_tone_figures {
  std::vector<harmonic> harmonics;  // from order 2 on
};

/// Linear.
[[nodiscard]] inline double channel_power(std::span<const double> power, const lumra_spectrum_info &info,
                                          double centre_hz, double bandwidth_hz) {
  double found = 0;
  check_open(lumra_channel_power(power.data(), power.size(), &info, centre_hz, bandwidth_hz, &found));
  return found;
}

[[nodiscard]] inline frequency_band occupied_bandwidth(std::span<const double> power, const lumra_spectrum_info &info,
                                                       double fraction = 0.99) {
  frequency_band band{};
  check_open(lumra_occupied_bandwidth(power.data(), power.size(), &info, fraction, &band.low_hz, &band.high_hz));
  return band;
}

/// One result for each offset.
[[nodiscard]] inline std::vector<adjacent> adjacent_power(std::span<const double> power,
                                                          const lumra_spectrum_info &info, double centre_hz,
                                                          double bandwidth_hz, std::span<const double> offsets_hz,
                                                          double adjacent_bandwidth_hz = 0) {
  std::vector<adjacent> found(offsets_hz.size());
  check_open(lumra_adjacent_power(power.data(), power.size(), &info, centre_hz, bandwidth_hz, adjacent_bandwidth_hz,
                                  offsets_hz.data(), offsets_hz.size(), found.data()));
  return found;
}

/// At most `most` peaks, highest first.
[[nodiscard]] inline std::vector<peak> find_peaks(std::span<const double> power, const lumra_spectrum_info &info,
                                                  std::size_t most,
                                                  const lumra_find_peaks_options &options = LUMRA_FIND_PEAKS_OPTIONS) {
  std::vector<peak> found(most < power.size() ? most : power.size());
  std::uint64_t count = 0;
  check_open(lumra_find_peaks(power.data(), power.size(), &info, &options, found.data(), found.size(), &count));
  found.resize(static_cast<std::size_t>(count));
  return found;
}

/// Of the strongest tone, or the one nearest to near_hz.
[[nodiscard]] inline tone_figures measure_tone(std::span<const double> power, const lumra_spectrum_info &info,
                                               std::optional<double> near_hz = {}, std::uint32_t highest_order = 5) {
  lumra_tone_options options = LUMRA_TONE_OPTIONS;
  options.harmonics = highest_order;
  options.choice = near_hz ? LUMRA_TONE_NEAREST : LUMRA_TONE_STRONGEST;
  options.near_hz = near_hz.value_or(0);
  tone_figures found{};
  found.harmonics.resize(highest_order > 1 ? highest_order - 1 : 0);
  check_open(
      lumra_tone(power.data(), power.size(), &info, &options, &found, found.harmonics.data(), found.harmonics.size()));
  return found;
}

}  // namespace lumra
