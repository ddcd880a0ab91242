// Phases that stay exact, however long a carrier turns. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

#include "signal/rate_ratio.hpp"

namespace dsp {

__extension__ typedef __int128 wide_integer;

/// A phase in cycles, or a frequency in cycles per sample, in units of 2^-128. It wraps as phases do: a product with a
/// number of samples is exact.
struct exact_cycles {
  wide_unsigned units = 0;

  /// Rounded once, to 2^-129. Both finite, the rate above 0, and twice the frequency not above it.
  static exact_cycles of(double frequency, double rate) noexcept;

  /// From -1/2 to 1/2.
  [[nodiscard]] double value() const noexcept {
    return static_cast<double>(static_cast<wide_integer>(units)) * 0x1p-128;
  }
  friend exact_cycles operator*(exact_cycles a, std::int64_t n) noexcept {
    return {a.units * static_cast<wide_unsigned>(wide_integer{n})};
  }
  friend exact_cycles operator-(exact_cycles a, exact_cycles b) noexcept { return {a.units - b.units}; }
  /// Of what value() is, rounded towards 0.
  friend exact_cycles operator/(exact_cycles a, std::int64_t n) noexcept {
    return {static_cast<wide_unsigned>(static_cast<wide_integer>(a.units) / n)};
  }
};

}  // namespace dsp
