// The one way in which the program gives up. SPDX-License-Identifier: MIT
#pragma once

#include <fmt/format.h>

#include <stdexcept>
#include <utility>

namespace tool {

/// Bad input or a failed system call. The text is one line that says what to do.
class failure : public std::runtime_error {
 public:
  template <class... Args>
  explicit failure(fmt::format_string<Args...> text, Args &&...args)
      : std::runtime_error(fmt::format(text, std::forward<Args>(args)...)) {}
};

}  // namespace tool
