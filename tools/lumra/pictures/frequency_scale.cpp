// SPDX-License-Identifier: MIT
#include "pictures/frequency_scale.hpp"

#include <algorithm>
#include <cmath>

#include "terminal/units.hpp"

namespace tool {

frequency_scale scale_of(double low_hz, double high_hz, double centre_hz) {
  const double span = high_hz - low_hz;
  const double largest = std::max(std::abs(low_hz), std::abs(high_hz));
  const double mark = mark_distance(span, 10);
  const bool absolute = largest < 1e5 * mark;
  const double origin = absolute ? 0 : centre_hz;
  // Numbers below 10000 in this unit.
  const frequency_unit unit = unit_for(absolute ? std::max(span / 2, largest / 10) : span / 2);
  const std::string title = absolute ? fmt::format("Frequency ({})", unit.name)
                                     : fmt::format("Offset from {} ({})", exact_text(centre_hz), unit.name);
  return {
      {title, (low_hz - origin) / unit.hertz, (high_hz - origin) / unit.hertz, mark / unit.hertz}, origin, unit.hertz};
}

}  // namespace tool
