// SPDX-License-Identifier: MIT
#include "signal/power_histogram.hpp"

#include <algorithm>
#include <bit>
#include <cmath>

namespace dsp {
namespace {

constexpr unsigned bin_shift = 52 - 9;  // keeps nine bits below the exponent

std::size_t bin_of(double power) noexcept {
  return static_cast<std::size_t>(std::bit_cast<std::uint64_t>(power) << 1 >> (bin_shift + 1));
}

/// Of a power's bin, what lies above it; zero and infinity are bins of their own.
double part_above(double power) noexcept {
  constexpr double width = std::uint64_t{1} << bin_shift;
  const std::uint64_t inside = std::bit_cast<std::uint64_t>(power) & ((std::uint64_t{1} << bin_shift) - 1);
  return bin_of(power) == 0 || std::isinf(power) ? 0 : 1 - static_cast<double>(inside) / width;
}

}  // namespace

void power_histogram::add(std::span<const double> power, double smallest, double largest) noexcept {
  const std::size_t first = bin_of(smallest), last = bin_of(largest);
  std::uint64_t *const counts = bins_of(0);
  if (first == last) {  // constant envelopes, and silence
    counts[first] += power.size();
    used_[first / bins_in_octave] = true;
    return;
  }
  for (const double p : power) {
    const std::size_t bin = bin_of(p);
    ++counts[bin];
    used_[bin / bins_in_octave] = true;
  }
}

void power_histogram::add(const power_histogram &other) noexcept {
  other.visit_octaves([this](std::size_t octave, auto counts) {
    const auto mine = refill(octave);
    for (std::size_t k = 0; k < bins_in_octave; ++k) mine[k] += counts[k];
  });
}

void power_histogram::clear() noexcept {
  visit_octaves([this](std::size_t octave, auto) { std::ranges::fill(refill(octave), 0); });
  used_.fill(false);
}

double power_histogram::count_above(double power) const noexcept {
  const std::size_t at = bin_of(power);
  std::uint64_t above = 0;
  double partly = 0;
  visit_octaves([&](std::size_t octave, auto counts) {
    for (std::size_t k = 0; k < bins_in_octave; ++k) {
      const std::size_t bin = octave * bins_in_octave + k;
      if (bin > at) above += counts[k];
      if (bin == at) partly = static_cast<double>(counts[k]) * part_above(power);
    }
  });
  return static_cast<double>(above) + partly;
}

}  // namespace dsp
