// The frequency axis of pictures. SPDX-License-Identifier: MIT
#pragma once

#include "pictures/gnuplot.hpp"

namespace tool {

/// Frequencies as they are, or where their numbers would be long, as offsets from the centre.
struct frequency_scale {
  picture_axis axis;
  double origin_hz, unit_hz;

  [[nodiscard]] double at(double hertz) const noexcept { return (hertz - origin_hz) / unit_hz; }
};

frequency_scale scale_of(double low_hz, double high_hz, double centre_hz);

}  // namespace tool
