// SPDX-License-Identifier: MIT
#include "signal/rate_ratio.hpp"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstddef>

namespace dsp {
namespace {

std::size_t bits_of(wide_unsigned x) noexcept {
  const auto high = static_cast<std::uint64_t>(x >> 64);
  return high != 0 ? 64 + std::bit_width(high) : std::bit_width(static_cast<std::uint64_t>(x));
}

wide_unsigned greatest_divisor(wide_unsigned a, wide_unsigned b) noexcept {
  while (b != 0) {
    const wide_unsigned rest = a % b;
    a = b;
    b = rest;
  }
  return a;
}

struct quotient {
  wide_unsigned whole, rest;
};

/// n a / b for b below 2^127, where the whole part is below 2^128; bit by bit, since n a takes up to 191 bits.
quotient multiply_divide(std::uint64_t n, wide_unsigned a, wide_unsigned b) noexcept {
  const wide_unsigned whole = a / b, rest = a % b;
  quotient sum{0, 0};
  for (auto bit = static_cast<int>(std::bit_width(n)); bit-- > 0;) {
    sum = {2 * sum.whole, 2 * sum.rest};
    if ((n >> bit & 1) != 0) {
      sum.whole += whole;
      if (sum.rest >= b) {
        sum.rest -= b;
        ++sum.whole;
      }
      sum.rest += rest;
    }
    if (sum.rest >= b) {
      sum.rest -= b;
      ++sum.whole;
    }
  }
  return sum;
}

wide_unsigned rounded_up(const quotient &q) noexcept {
  return q.whole + (q.rest != 0 ? 1 : 0);
}

/// A double is mantissa times 2^exponent, the mantissa odd.
struct parts {
  std::uint64_t mantissa;
  int exponent;

  explicit parts(double x) noexcept {
    int above = 0;
    mantissa = static_cast<std::uint64_t>(std::ldexp(std::frexp(x, &above), 53));
    const int zeros = std::countr_zero(mantissa);
    mantissa >>= zeros;
    exponent = above - 53 + zeros;
  }
};

}  // namespace

bool rate_ratio::are_near(double output_rate, double input_rate) noexcept {
  int output_exponent = 0, input_exponent = 0;
  const double output = std::frexp(output_rate, &output_exponent), input = std::frexp(input_rate, &input_exponent);
  const double ratio = std::ldexp(output / input, output_exponent - input_exponent);
  return ratio < limit && ratio > 1 / limit;
}

rate_ratio::terms rate_ratio::in_lowest(wide_unsigned up, wide_unsigned down) noexcept {
  const wide_unsigned common = greatest_divisor(up, down);
  return {up / common, down / common};
}

/// Mantissas are odd, so that the power of two is nobody's common factor. Near rates keep the terms below 2^84.
rate_ratio::terms rate_ratio::of_rates(double output_rate, double input_rate) noexcept {
  const parts output(output_rate), input(input_rate);
  terms ratio = in_lowest(output.mantissa, input.mantissa);
  const int shift = output.exponent - input.exponent;
  (shift > 0 ? ratio.up : ratio.down) <<= std::abs(shift);
  return ratio;
}

rate_ratio::rate_ratio(double output_rate, double input_rate) noexcept
    : rate_ratio(of_rates(output_rate, input_rate)) {}

rate_ratio::rate_ratio(std::uint64_t up, std::uint64_t down) noexcept : rate_ratio(in_lowest(up, down)) {}

rate_ratio::rate_ratio(const terms &lowest) noexcept
    : up_(lowest.up),
      down_(lowest.down),
      whole_step_(static_cast<std::uint64_t>(down_ / up_)),
      rest_step_(down_ % up_),
      fraction_shift_(static_cast<int>(std::max<std::size_t>(bits_of(up_), 63) - 63)),
      fraction_unit_(1 / static_cast<double>(up_ >> fraction_shift_)) {}

rate_ratio rate_ratio::times(std::uint64_t a, std::uint64_t b) const noexcept {
  const terms first = in_lowest(up_, b), second = in_lowest(a, down_);
  return rate_ratio(in_lowest(first.up * second.up, first.down * second.down));
}

wide_unsigned rate_ratio::outputs(std::uint64_t n) const noexcept {
  return rounded_up(multiply_divide(n, up_, down_));
}

wide_unsigned rate_ratio::inputs(std::uint64_t n) const noexcept {
  return n == 0 ? 0 : multiply_divide(n - 1, down_, up_).whole + 1;
}

stream_position rate_ratio::position(std::uint64_t k) const noexcept {
  const quotient at = multiply_divide(k, down_, up_);
  return {static_cast<std::uint64_t>(at.whole), at.rest};
}

}  // namespace dsp
