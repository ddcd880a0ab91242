// SPDX-License-Identifier: MIT
#include "toolkit/frame.hpp"

namespace toolkit {

std::int32_t status_of_current_exception() noexcept {
  try {
    throw;
  } catch (const failure &f) {
    return f.code();
  } catch (...) {
    return no_memory;
  }
}

}  // namespace toolkit
