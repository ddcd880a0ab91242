// SPDX-License-Identifier: MIT
#include "signal/spectrum_figures.hpp"

#include <algorithm>
#include <array>
#include <limits>

namespace dsp {
namespace {

/// Power between two positions in the band.
double integrate(const spectrum_view &s, double low, double high) noexcept {
  if (low >= high) return 0;
  const auto first = static_cast<std::int64_t>(std::floor(low + 0.5));
  const auto last = static_cast<std::int64_t>(std::floor(high + 0.5));
  if (first == last) return s.density(first) * (high - low);
  double power = s.density(first) * (static_cast<double>(first) + 0.5 - low);
  power += sum(s.power.subspan(static_cast<std::size_t>(first + 1), static_cast<std::size_t>(last - first - 1)));
  const double inside = high - (static_cast<double>(last) - 0.5);
  return inside > 0 ? power + s.density(last) * inside : power;
}

/// The bins with the parts of them that lie in the band, from below: those of two sides of an even number are one more,
/// as bin 0 is halved.
struct band_cells {
  const spectrum_view &s;
  bool halved = !s.one_sided && s.points % 2 == 0;
  std::size_t count = s.power.size() + (halved ? 1 : 0);

  [[nodiscard]] double power(std::size_t cell) const noexcept {
    return halved && (cell == 0 || cell == s.power.size()) ? s.power[0] / 2 : s.power[cell];
  }
  [[nodiscard]] double lower(std::size_t cell) const noexcept {
    return std::max(static_cast<double>(cell) - 0.5, s.begin());
  }
  [[nodiscard]] double upper(std::size_t cell) const noexcept {
    return std::min(static_cast<double>(cell) + 0.5, s.end());
  }
};

}  // namespace

double sum(std::span<const double> values) noexcept {
  constexpr std::size_t lanes = 8, block = 256;
  if (values.size() > block) {
    const std::size_t half = values.size() / 2 / lanes * lanes;
    return sum(values.first(half)) + sum(values.subspan(half));
  }
  std::array<double, lanes> sums{};
  std::size_t k = 0;
  for (; k + lanes <= values.size(); k += lanes)
    for (std::size_t j = 0; j < lanes; ++j) sums[j] += values[k + j];
  for (std::size_t j = 0; k < values.size(); ++k, ++j) sums[j] += values[k];
  return ((sums[0] + sums[1]) + (sums[2] + sums[3])) + ((sums[4] + sums[5]) + (sums[6] + sums[7]));
}

std::optional<double> channel_power(const spectrum_view &s, double centre, double bandwidth) noexcept {
  const double width = bandwidth / s.spacing();
  double low = s.position(centre) - width / 2, high = low + width;
  // A few units in the last place of the frequencies.
  const double slack =
      16 * std::numeric_limits<double>::epsilon() * (std::abs(centre) + std::abs(s.centre) + s.rate) / s.spacing();
  const double lowest = -0.5, highest = std::max(s.end(), static_cast<double>(s.power.size()) - 0.5);
  const auto widest = static_cast<double>(s.points);
  const bool inside = low >= lowest - slack && high <= highest + slack && width <= widest + slack;
  if (!inside) return std::nullopt;
  low = std::max(low, s.one_sided ? 0.0 : lowest);
  high = std::min({high, s.one_sided ? s.end() : highest, low + widest});
  return integrate(s, low, high) / s.noise_bandwidth;
}

frequency_range occupied_bandwidth(const spectrum_view &s, double fraction) noexcept {
  const double total = sum(s.power);
  constexpr double none = std::numeric_limits<double>::quiet_NaN();
  if (!std::isfinite(total) || !(total > 0)) return {none, none};
  const band_cells cells{s};
  const double tail = (1 - fraction) / 2 * total;

  double below = tail;
  std::size_t low = 0;
  while (low + 1 < cells.count && cells.power(low) <= below) below -= cells.power(low++);
  const auto part = [&](std::size_t cell, double power) {
    const double inside = cells.power(cell) > 0 ? std::clamp(power / cells.power(cell), 0.0, 1.0) : 0.0;
    return inside * (cells.upper(cell) - cells.lower(cell));
  };
  double above = tail;
  std::size_t high = cells.count - 1;
  while (high > 0 && cells.power(high) <= above) above -= cells.power(high--);

  const double from = cells.lower(low) + part(low, below), to = cells.upper(high) - part(high, above);
  return {s.frequency(from), s.frequency(std::max(from, to))};
}

}  // namespace dsp
