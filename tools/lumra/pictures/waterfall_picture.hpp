// The picture of levels over time and frequency. SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "pictures/gnuplot.hpp"

namespace tool {

/// Something that somebody has marked.
struct waterfall_box {
  double low_hz, high_hz, begin_s, end_s;
  std::string text;
};

struct waterfall_picture {
  std::string title, settings, level_unit;
  double low_hz = 0, high_hz = 0;             // outer edges of the columns
  double centre_hz = 0;                       // from which offsets are drawn where frequencies would be too long
  double begin_s = 0, step_s = 0;             // of the rows
  std::vector<std::vector<float>> levels_db;  // by row; minus infinity for silence
  std::optional<std::pair<double, double>> range_db;  // of the colours; else what is there
  std::vector<waterfall_box> boxes;
};

std::string waterfall_script(const waterfall_picture &picture, picture_type type);

}  // namespace tool
