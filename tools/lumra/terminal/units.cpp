// SPDX-License-Identifier: MIT
#include "terminal/units.hpp"

#include <fmt/core.h>

#include <algorithm>
#include <cmath>

namespace tool {
namespace {

int decimals(double resolution, const frequency_unit &unit) {
  return static_cast<int>(std::clamp(std::ceil(-std::log10(resolution / unit.hertz)), 0.0, 12.0));
}

}  // namespace

time_unit time_unit_for(double seconds) {
  if (seconds >= 1) return {1, "s"};
  if (seconds >= 1e-3) return {1e-3, "ms"};
  if (seconds >= 1e-6) return {1e-6, "µs"};
  return {1e-9, "ns"};
}

frequency_unit unit_for(double hertz) {
  const double size = std::abs(hertz);
  if (size >= 1e9) return {1e9, "GHz"};
  if (size >= 1e6) return {1e6, "MHz"};
  if (size >= 1e3) return {1e3, "kHz"};
  return {1, "Hz"};
}

std::string frequency_text(double hertz, double resolution) {
  const frequency_unit unit = unit_for(hertz == 0 ? resolution : hertz);
  return fmt::format("{:.{}f} {}", hertz / unit.hertz, decimals(resolution, unit), unit.name);
}

std::string exact_text(double hertz) {
  const frequency_unit unit = unit_for(hertz);
  return fmt::format("{:.12g} {}", hertz / unit.hertz, unit.name);
}

std::string short_text(double hertz) {
  const frequency_unit unit = unit_for(hertz);
  return fmt::format("{:.6g} {}", hertz / unit.hertz, unit.name);
}

}  // namespace tool
