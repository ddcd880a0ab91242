// SPDX-License-Identifier: MIT
#include "qsrfhs/math/mkl_status.hpp"

namespace qsrfhs {

bool failed(MKL_LONG status) noexcept {
  return status != 0 && !DftiErrorClass(status, DFTI_NO_ERROR);
}

void throw_if_failed(MKL_LONG status, source_position at) {
  constexpr std::int32_t undefined_error = -312499;
  if (!failed(status)) return;
  const char *text = DftiErrorMessage(status);
  throw mkl_error(at, undefined_error, static_cast<std::int32_t>(status), text ? text : "");
}

}  // namespace qsrfhs
