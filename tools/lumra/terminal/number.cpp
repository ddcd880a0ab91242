// SPDX-License-Identifier: MIT
#include "terminal/number.hpp"

#include <fmt/core.h>

#include <charconv>
#include <cmath>

namespace tool {

std::optional<double> parse_number(std::string_view text) {
  const std::size_t end = std::min(text.find_first_not_of("+-.0123456789eE"), text.size());
  std::string_view digits = text.substr(0, end), suffix = text.substr(end);
  if (digits.starts_with('+')) digits.remove_prefix(1);
  for (const std::string_view unit : {"Hz", "s"})
    if (suffix.ends_with(unit)) {
      suffix.remove_suffix(unit.size());
      break;
    }
  constexpr std::string_view prefixes = "num kMGT";  // in steps of a thousand, the space standing for none
  int power = 0;
  if (!suffix.empty()) {
    const std::size_t place = suffix == "K" ? prefixes.find('k') : prefixes.find(suffix);
    if (suffix.size() != 1 || suffix == " " || place == std::string_view::npos) return std::nullopt;
    power = 3 * (static_cast<int>(place) - 3);
  }
  // The prefix moves the exponent in the text, so that the number is rounded once.
  const std::size_t mark = digits.find_first_of("eE");
  int exponent = 0;
  if (mark != std::string_view::npos) {
    std::string_view written = digits.substr(mark + 1);
    if (written.starts_with('+')) written.remove_prefix(1);
    const auto [at, error] = std::from_chars(written.data(), written.data() + written.size(), exponent);
    if (error != std::errc() || at != written.data() + written.size() || std::abs(exponent) > 10000)
      return std::nullopt;
    digits = digits.substr(0, mark);
  }
  const std::string moved = fmt::format("{}e{}", digits, exponent + power);
  double value = 0;
  const auto [at, error] = std::from_chars(moved.data(), moved.data() + moved.size(), value);
  if (error != std::errc() || at != moved.data() + moved.size() || !std::isfinite(value)) return std::nullopt;
  return value;
}

std::string plain_number(double value) {
  constexpr double exactly_whole = 9007199254740992;  // 2^53
  if (std::abs(value) <= exactly_whole && value == std::trunc(value)) return fmt::format("{:.0f}", value);
  return fmt::format("{:.17g}", value);
}

}  // namespace tool
