// Spectra that follow each other in time, as the rows of a picture. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <lumra/spectrum.hpp>
#include <vector>

#include "analysis/selection.hpp"
#include "recording/source.hpp"

namespace tool {

/// Every row holds the same number of segments, but perhaps the last.
struct waterfall_rows {
  std::size_t columns = 0;               // of each row
  std::vector<std::vector<float>> rows;  // power; of several bins in a column, the highest
  double time_step_s = 0;                // from a row to the next
  lumra::averaged_spectrum whole;        // the average of all of it
};

/// About `rows` of them, never more than twice as many, and at most `columns` columns. The selection is one stretch,
/// whose samples become those that there were.
waterfall_rows make_waterfall(const recording::source &source, selection &chosen,
                              const lumra::spectrum_settings &settings, std::size_t rows, std::size_t columns);

}  // namespace tool
