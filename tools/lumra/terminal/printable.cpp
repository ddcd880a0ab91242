// SPDX-License-Identifier: MIT
#include "terminal/printable.hpp"
#include "terminal/append.hpp"

#include <fmt/core.h>

#include <algorithm>
#include <iterator>

namespace tool {
namespace {

/// Characters that a terminal obeys instead of showing them: the two sets of controls, separators of lines, and those
/// that turn the direction of the text behind them.
constexpr bool is_control(char32_t c) noexcept {
  return c < 0x20 || (c >= 0x7F && c < 0xA0) || (c >= 0x200E && c <= 0x200F) || (c >= 0x2028 && c <= 0x202E) ||
         (c >= 0x2066 && c <= 0x2069);
}

/// How many bytes the first character has; 0 where it is a control or not UTF-8.
std::size_t length_of_shown(std::string_view text) noexcept {
  const auto first = static_cast<unsigned char>(text.front());
  const std::size_t length = first < 0x80   ? 1
                             : first < 0xC2 ? 0
                             : first < 0xE0 ? 2
                             : first < 0xF0 ? 3
                             : first < 0xF5 ? 4
                                            : 0;
  if (length == 0 || length > text.size()) return 0;
  char32_t c = length == 1 ? first : first & (0xFFU >> (length + 1));
  for (const char next : text.substr(1, length - 1)) {
    const auto byte = static_cast<unsigned char>(next);
    if ((byte & 0xC0) != 0x80) return 0;
    c = c << 6 | (byte & 0x3FU);
  }
  return is_control(c) ? 0 : length;
}

}  // namespace

std::string printable(std::string_view text) {
  std::string result;
  while (!text.empty()) {
    const std::size_t length = length_of_shown(text);
    if (length > 0)
      result += text.substr(0, length);
    else
      append(result, "\\x{:02X}", static_cast<unsigned char>(text.front()));
    text.remove_prefix(std::max<std::size_t>(length, 1));
  }
  return result;
}

}  // namespace tool
