// The highest local maxima of a power spectrum. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "signal/main_lobe.hpp"
#include "signal/spectrum_figures.hpp"

namespace dsp {

struct peak {
  double position;  // in the band
  double power;
};

struct peak_search {
  double threshold;          // peaks are above it
  std::uint64_t apart;       // bins from peak to peak, 1 or more
  std::uint64_t first, end;  // the bins to search
  std::uint64_t most;        // of the highest peaks
};

/// Highest first. Takes memory for the peaks and for 1 in 256 bins.
[[nodiscard]] std::vector<peak> find_peaks(const spectrum_view &spectrum, const main_lobe &lobe,
                                           const peak_search &search);

/// The line whose highest bin is given, from its neighbours.
[[nodiscard]] peak interpolate_peak(const spectrum_view &spectrum, const main_lobe &lobe, std::size_t bin) noexcept;

}  // namespace dsp
