// The ratio of two sample rates, exactly. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

namespace dsp {

__extension__ typedef unsigned __int128 wide_unsigned;

/// A place in a stream: whole samples, and a rest in parts of the ratio's numerator.
struct stream_position {
  std::uint64_t whole;
  wide_unsigned rest;
};

/// Output samples for each input sample, as a fraction in lowest terms. Output k lies at k down / up input samples.
/// Counts and positions are those of the fraction, without rounding, for streams of up to 2^62 samples.
class rate_ratio {
 public:
  /// Rates are less than this factor apart.
  static constexpr double limit = 1e9;
  /// Both finite and above 0.
  static bool are_near(double output_rate, double input_rate) noexcept;

  rate_ratio() noexcept : rate_ratio(std::uint64_t{1}, std::uint64_t{1}) {}
  /// Rates that are near, as the numbers that the doubles are.
  rate_ratio(double output_rate, double input_rate) noexcept;
  /// Both from 1, and near.
  rate_ratio(std::uint64_t up, std::uint64_t down) noexcept;

  /// The ratio times a / b, both from 1, where its terms stay below 2^127.
  [[nodiscard]] rate_ratio times(std::uint64_t a, std::uint64_t b) const noexcept;

  [[nodiscard]] wide_unsigned up() const noexcept { return up_; }
  [[nodiscard]] wide_unsigned down() const noexcept { return down_; }
  [[nodiscard]] bool is_one() const noexcept { return up_ == down_; }
  [[nodiscard]] double value() const noexcept { return static_cast<double>(up_) / static_cast<double>(down_); }

  /// Outputs that lie in front of the end of n inputs: ceil(n up / down).
  [[nodiscard]] wide_unsigned outputs(std::uint64_t n) const noexcept;
  /// The fewest inputs that have n outputs in front of their end.
  [[nodiscard]] wide_unsigned inputs(std::uint64_t n) const noexcept;

  /// Where output k lies among the inputs; the whole part is below 2^64.
  [[nodiscard]] stream_position position(std::uint64_t k) const noexcept;
  void advance(stream_position &at) const noexcept {
    at.whole += whole_step_;
    at.rest += rest_step_;
    if (at.rest >= up_) {
      at.rest -= up_;
      ++at.whole;
    }
  }
  /// 0 to 1, rounded.
  [[nodiscard]] double fraction(const stream_position &at) const noexcept {
    return static_cast<double>(static_cast<std::int64_t>(at.rest >> fraction_shift_)) * fraction_unit_;
  }

 private:
  struct terms {
    wide_unsigned up, down;
  };
  explicit rate_ratio(const terms &lowest) noexcept;
  static terms of_rates(double output_rate, double input_rate) noexcept;
  static terms in_lowest(wide_unsigned up, wide_unsigned down) noexcept;

  wide_unsigned up_, down_;
  std::uint64_t whole_step_;  // down / up
  wide_unsigned rest_step_;
  int fraction_shift_;  // so that a rest fits a signed number of 64 bits
  double fraction_unit_;
};

}  // namespace dsp
