// The one way in which reading and writing a recording fails. SPDX-License-Identifier: MIT
#pragma once

#include <fmt/core.h>

#include <stdexcept>
#include <string>
#include <utility>

namespace recording {

/// Bad input or a failed system call. The text is one sentence that says what to do; texts from files stand in it as
/// they are, control characters included.
class failure : public std::runtime_error {
 public:
  template <class... Args>
  explicit failure(fmt::format_string<Args...> text, Args &&...args)
      : std::runtime_error(fmt::format(text, std::forward<Args>(args)...)) {}
};

/// The system's text for a value of errno. Missing memory is no fault of the file in question: throws std::bad_alloc.
std::string system_reason(int code);

}  // namespace recording
