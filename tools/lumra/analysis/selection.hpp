// Which of a recording's stretches an analysis runs over. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "recording/source.hpp"

namespace tool {

struct selection {
  std::vector<recording::stretch> stretches;  // of one frequency, in order; one at least
  std::uint64_t samples = 0;                  // of all of them, or recording::endless
  std::optional<double> frequency;            // centre in hertz, where known; of the first stretch
  std::string text;                           // what was left out and how to choose it; empty if nothing was
};

/// All stretches, whatever their frequencies are. Throws failure without samples.
selection select_all(const recording::source &source);
/// All stretches of the frequency that most samples have, of equals the first. Throws failure without samples.
selection select_frequency(const recording::source &source);
/// The longest stretch, of equals the first.
selection select_stretch(const recording::source &source);

}  // namespace tool
