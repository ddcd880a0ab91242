// SPDX-License-Identifier: MIT
#include "signal/exact_sum.hpp"

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>

namespace dsp {
namespace {

constexpr int digit_bits = 32;
constexpr std::uint64_t digit_mask = (std::uint64_t{1} << digit_bits) - 1;
constexpr std::uint32_t most_pending = std::uint32_t{1} << 28;  // each adds less than 2^34 to a digit

}  // namespace

void exact_sum::add(double number) noexcept {
  const auto bits = std::bit_cast<std::uint64_t>(number);
  const auto exponent = static_cast<unsigned>(bits >> 52 & 0x7ff);
  const bool negative = (bits >> 63) != 0;
  const std::uint64_t fraction = bits & ((std::uint64_t{1} << 52) - 1);
  if (exponent == 0x7ff) {
    not_finite_ |= fraction != 0 ? nan : negative ? negative_infinity : positive_infinity;
    return;
  }
  const std::uint64_t mantissa = exponent == 0 ? fraction : fraction | std::uint64_t{1} << 52;
  const unsigned position = exponent == 0 ? 0 : exponent - 1, offset = position % digit_bits;
  const std::uint64_t low = (mantissa & digit_mask) << offset, high = (mantissa >> digit_bits) << offset;
  std::int64_t *const at = digits_.data() + position / digit_bits;
  const std::int64_t sign = negative ? -1 : 1;
  at[0] += sign * static_cast<std::int64_t>(low & digit_mask);
  at[1] += sign * static_cast<std::int64_t>((low >> digit_bits) + (high & digit_mask));
  at[2] += sign * static_cast<std::int64_t>(high >> digit_bits);
  if (++pending_ == most_pending) carry();
}

void exact_sum::add(const exact_sum &other) noexcept {
  exact_sum carried = other;
  carried.carry();
  carry();
  for (std::size_t k = 0; k < digit_count; ++k) digits_[k] += carried.digits_[k];
  not_finite_ |= carried.not_finite_;
  carry();
}

void exact_sum::carry() noexcept {
  for (std::size_t k = 0; k + 1 < digit_count; ++k) {
    digits_[k + 1] += digits_[k] >> digit_bits;
    digits_[k] &= static_cast<std::int64_t>(digit_mask);
  }
  pending_ = 0;
}

double exact_sum::value() const noexcept {
  constexpr double infinity = std::numeric_limits<double>::infinity();
  if (not_finite_ == positive_infinity) return infinity;
  if (not_finite_ == negative_infinity) return -infinity;
  if (not_finite_ != 0) return std::numeric_limits<double>::quiet_NaN();
  exact_sum sum = *this;
  sum.carry();
  const bool negative = sum.digits_.back() < 0;
  if (negative) {
    for (std::int64_t &digit : sum.digits_) digit = -digit;
    sum.carry();
  }
  double value = 0;
  for (std::size_t k = 0; k < digit_count; ++k)
    if (sum.digits_[k] != 0)
      value += std::ldexp(static_cast<double>(sum.digits_[k]), digit_bits * static_cast<int>(k) - 1074);
  return negative ? -value : value;
}

exact_sum::image exact_sum::save() const noexcept {
  exact_sum sum = *this;
  sum.carry();
  return {sum.digits_, sum.not_finite_};
}

bool exact_sum::load(const image &saved) noexcept {
  const auto is_digit = [](std::int64_t d) { return d >= 0 && d <= static_cast<std::int64_t>(digit_mask); };
  const std::int64_t most = std::int64_t{1} << 62;
  if (!std::all_of(saved.digits.begin(), saved.digits.end() - 1, is_digit) || saved.digits.back() >= most ||
      saved.digits.back() < -most || saved.not_finite > (nan | positive_infinity | negative_infinity))
    return false;
  digits_ = saved.digits;
  not_finite_ = saved.not_finite;
  pending_ = 0;
  return true;
}

}  // namespace dsp
