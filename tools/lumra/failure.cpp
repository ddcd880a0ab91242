// SPDX-License-Identifier: MIT
#include "failure.hpp"

#include <cerrno>
#include <iterator>
#include <new>
#include <system_error>

namespace tool {

std::string system_reason(int code) {
  if (code == ENOMEM) throw std::bad_alloc();
  return std::generic_category().message(code);
}

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
