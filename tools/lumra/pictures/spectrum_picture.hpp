// Pictures of levels over frequency. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/spectrum.hpp>
#include <string>
#include <utility>
#include <vector>

#include "pictures/gnuplot.hpp"

namespace tool {

/// One recording's curve. Levels of silence are minus infinity.
struct spectrum_curve {
  std::string name;
  std::vector<double> frequency_hz, level_db;
  std::vector<double> lowest_db, highest_db;  // the band around it; empty for none
};

/// A line that is pointed out.
struct spectrum_mark {
  double frequency_hz, level_db;
  std::string text;
};

/// A stretch of frequencies that is pointed out.
struct spectrum_stretch {
  double low_hz, high_hz;
  std::string text;
  bool is_bare = false;  // an arrow alone, without a coloured background
};

struct spectrum_picture {
  std::string title, settings;
  std::string level_unit;                   // dBFS or dBm
  double low_hz = 0, high_hz = 0;           // ends of the frequency axis
  double centre_hz = 0;                     // from which offsets are drawn where frequencies would be too long
  bool is_shared = false;                   // by several recordings
  std::vector<spectrum_curve> curves;       // one or more
  std::vector<spectrum_mark> marks;         // behind the highest curve's frequencies
  std::vector<std::string> list;            // what the marks stand for, where they have numbers
  std::vector<spectrum_stretch> stretches;  // one above the other where they overlap
};

/// The curve of the bins [first, last) and how many of them are one of its points: where they are more than a picture
/// shows, a point is their mean within a band from the lowest to the highest. Held extremes are a band, too.
spectrum_curve curve_of(std::string name, const lumra::averaged_spectrum &spectrum,
                        std::pair<std::size_t, std::size_t> bins, double calibration_db);
/// Says what the band is; empty where there is none.
std::string band_text(const lumra::averaged_spectrum &spectrum, std::pair<std::size_t, std::size_t> bins);

/// The gnuplot script.
std::string spectrum_script(const spectrum_picture &picture, picture_type type);

}  // namespace tool
