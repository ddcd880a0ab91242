// Pictures of power statistics and of levels over time. SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "pictures/gnuplot.hpp"

namespace tool {

/// The share of samples above each level, falling to 0.
struct ccdf_curve {
  std::string name;
  std::vector<double> above_db, probability;
  bool is_real = false;  // which noise of Gaussian samples it is drawn beside
};

std::string ccdf_script(const std::string &title, const std::string &settings, const std::vector<ccdf_curve> &curves,
                        picture_type type);

/// Levels of silence are minus infinity.
struct envelope_curve {
  std::string name;
  std::vector<double> time_s, rms_db, peak_db;
};

std::string envelope_script(const std::string &title, const std::string &settings, const std::string &level_unit,
                            const std::vector<envelope_curve> &curves, picture_type type);

}  // namespace tool
