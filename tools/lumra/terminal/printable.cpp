// SPDX-License-Identifier: MIT
#include "terminal/printable.hpp"

#include <fmt/format.h>

#include <iterator>

namespace tool {

std::string printable(std::string_view text) {
  std::string result;
  for (const char c : text)
    if (const auto byte = static_cast<unsigned char>(c); byte < 0x20 || byte == 0x7F)
      fmt::format_to(std::back_inserter(result), "\\x{:02X}", byte);
    else
      result += c;
  return result;
}

}  // namespace tool
