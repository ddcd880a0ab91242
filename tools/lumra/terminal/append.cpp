// SPDX-License-Identifier: MIT
#include "terminal/append.hpp"

#include <fmt/format.h>

#include <iterator>

namespace tool {

void append_formatted(std::string &to, fmt::string_view text, fmt::format_args values) {
  fmt::vformat_to(std::back_inserter(to), text, values);
}

}  // namespace tool
