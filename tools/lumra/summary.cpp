// SPDX-License-Identifier: MIT
#include "summary.hpp"

#include <fmt/format.h>
#include <unistd.h>

namespace tool {

void summary_line(const char *label, const std::string &text) {
  const bool styled = ::isatty(STDOUT_FILENO) == 1;
  fmt::print("{}{:<22}{}{}\n", styled ? "\033[1m" : "", label, styled ? "\033[0m" : "", text);
}

}  // namespace tool
