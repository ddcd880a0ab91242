// SPDX-License-Identifier: MIT
#include "qsrfhs/math/mkl_status.hpp"

namespace qsrfhs {

bool failed(MKL_LONG status) noexcept {
  return status != 0 && !DftiErrorClass(status, DFTI_NO_ERROR);
}

}  // namespace qsrfhs
