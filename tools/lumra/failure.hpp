// The one way in which the program gives up. SPDX-License-Identifier: MIT
#pragma once

#include <fmt/format.h>

#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>

namespace tool {

/// Bad input or a failed system call. The text is one line that says what to do.
class failure : public std::runtime_error {
 public:
  template <class... Args>
  explicit failure(fmt::format_string<Args...> text, Args &&...args)
      : std::runtime_error(fmt::format(text, std::forward<Args>(args)...)) {}
};

/// The system's text for a value of errno. Missing memory is no fault of the file in question: throws std::bad_alloc.
std::string system_reason(int code);

/// A text that may come from a file, with control characters escaped, so that it is one line and no terminal obeys it.
std::string printable(std::string_view text);

}  // namespace tool
