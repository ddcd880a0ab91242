// Levels, power statistics and envelope of a recording of any length in constant memory. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/level.h>

#include <cstdint>
#include <vector>

#include "analysis/selection.hpp"
#include "recording/source.hpp"

namespace tool {

/// Neighbouring samples: their mean power and the largest of them.
struct envelope_cell {
  double power = 0, peak_power = 0;
  std::uint64_t samples = 0;
};

struct measured_level {
  lumra_level_result levels{};
  std::uint64_t clipped = 0;                  // samples with a part at an end of their type
  std::vector<double> above_db, probability;  // down to the first power that no sample exceeds
  std::vector<envelope_cell> envelope;        // of `cell` samples each, all but the last; empty unless asked for
  std::uint64_t cell = 0;
};

/// The selection's samples become those that there were. Throws failure where there are none.
measured_level measure_level(const recording::source &source, selection &chosen, bool with_envelope);

}  // namespace tool
