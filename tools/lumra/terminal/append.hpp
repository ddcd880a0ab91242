// Formatting onto the end of a text. SPDX-License-Identifier: MIT
#pragma once

#include <fmt/core.h>

#include <string>

namespace tool {

/// What is behind append(): the formatting itself is compiled once.
void append_formatted(std::string &to, fmt::string_view text, fmt::format_args values);

template <class... Args>
void append(std::string &to, fmt::format_string<Args...> text, Args &&...values) {
  append_formatted(to, text, fmt::make_format_args(values...));
}

}  // namespace tool
