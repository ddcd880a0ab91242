// SPDX-License-Identifier: MIT
#include "recording/failure.hpp"

#include <cerrno>
#include <new>
#include <system_error>

namespace recording {

std::string system_reason(int code) {
  if (code == ENOMEM) throw std::bad_alloc();
  return std::generic_category().message(code);
}

}  // namespace recording
