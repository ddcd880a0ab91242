// Positions in a stream: exact, in units of 2^-64 of an input sample. SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <cstdint>

namespace toolkit {

__extension__ typedef __int128 wide_integer;
__extension__ typedef unsigned __int128 wide_unsigned;

/// A position or a distance in the stream.
struct position {
  wide_integer units = 0;

  static constexpr wide_integer one = wide_integer{1} << 64;

  /// Exact for multiples of 2^-64; 0 <= samples < 2^62.
  static position of(double samples) noexcept {
    const double whole = std::floor(samples);
    const double fraction = std::nearbyint(std::ldexp(samples - whole, 64));
    return {static_cast<wide_integer>(whole) * one + static_cast<wide_integer>(fraction)};
  }
  static constexpr position of_whole(std::int64_t samples) noexcept { return {wide_integer{samples} * one}; }

  /// Rounded down, below 0 too.
  [[nodiscard]] constexpr std::int64_t whole() const noexcept { return static_cast<std::int64_t>(units >> 64); }
  /// In units of 2^-64.
  [[nodiscard]] constexpr std::uint64_t fraction_units() const noexcept { return static_cast<std::uint64_t>(units); }
  /// 0 <= fraction < 1, rounded down to a double.
  [[nodiscard]] constexpr double fraction() const noexcept {
    return static_cast<double>(fraction_units() >> 11) * 0x1p-53;
  }

  friend constexpr position operator+(position a, position b) noexcept { return {a.units + b.units}; }
  friend constexpr position operator-(position a, position b) noexcept { return {a.units - b.units}; }
  friend constexpr position operator*(position a, std::int64_t n) noexcept { return {a.units * n}; }
};

}  // namespace toolkit
