// SPDX-License-Identifier: MIT
#include "signal/exact_cycles.hpp"

#include <cmath>

namespace dsp {

exact_cycles exact_cycles::of(double frequency, double rate) noexcept {
  int frequency_exponent = 0, rate_exponent = 0;
  const auto dividend =
      static_cast<std::uint64_t>(std::ldexp(std::frexp(std::abs(frequency), &frequency_exponent), 53));
  const auto divisor = static_cast<std::uint64_t>(std::ldexp(std::frexp(rate, &rate_exponent), 53));
  // One bit more than the result has, for rounding. The quotient is below a half, so that nothing is lost in front.
  const int bits = frequency_exponent - rate_exponent + 129;
  if (dividend == 0 || bits < 0) return {};
  wide_unsigned quotient = dividend / divisor;
  std::uint64_t rest = dividend % divisor;
  for (int bit = 0; bit < bits; ++bit) {
    rest *= 2;
    quotient = 2 * quotient + rest / divisor;
    rest %= divisor;
  }
  quotient = quotient / 2 + quotient % 2;
  return {frequency < 0 ? -quotient : quotient};
}

}  // namespace dsp
