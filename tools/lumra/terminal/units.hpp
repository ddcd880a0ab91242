// Frequencies and times as people write them. SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace tool {

struct frequency_unit {
  double hertz;
  const char *name;
};

struct time_unit {
  double seconds;
  const char *name;
};

/// The unit in which this time has one to three digits before the point, at most seconds.
time_unit time_unit_for(double seconds);

/// The unit in which this frequency has one to three digits before the point.
frequency_unit unit_for(double hertz);

/// Frequency in its own unit with the digits that a resolution is worth: "5.925123 GHz".
std::string frequency_text(double hertz, double resolution);

/// Shortest exact text in its own unit: "10 MHz".
std::string exact_text(double hertz);

/// The same to six digits.
std::string short_text(double hertz);

}  // namespace tool
