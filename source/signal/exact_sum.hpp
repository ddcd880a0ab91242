// Sums of numbers in any order, exact until they are read. SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>

namespace dsp {

/// A sum of doubles as a fixed-point number that has a place for every bit of every one of them: the same whatever the
/// order is in which they are added. Numbers that are not finite are only remembered, and then are the result.
class exact_sum {
 public:
  /// Digits of 32 bits from 2^-1074 up, and a last one with the sign: of 2^64 numbers at most.
  static constexpr std::size_t digit_count = 68;

  void add(double number) noexcept;
  void add(const exact_sum &other) noexcept;

  /// Within one unit in the last place.
  [[nodiscard]] double value() const noexcept;

  /// The sum as it is saved: one sequence of digits for each sum.
  struct image {
    std::array<std::int64_t, digit_count> digits;
    std::uint64_t not_finite;
  };
  [[nodiscard]] image save() const noexcept;
  /// False for what no sum saves.
  [[nodiscard]] bool load(const image &saved) noexcept;

 private:
  enum : std::uint64_t { nan = 1, positive_infinity = 2, negative_infinity = 4 };

  void carry() noexcept;

  std::array<std::int64_t, digit_count> digits_{};
  std::uint64_t not_finite_ = 0;
  std::uint32_t pending_ = 0;  // numbers added since digits were last carried
};

}  // namespace dsp
