// The one rule by which an MKL status is a failure. SPDX-License-Identifier: MIT
#pragma once

#include <mkl_dfti.h>

namespace qsrfhs {

/// True unless the status is 0 or of the class without error.
[[nodiscard]] bool failed(MKL_LONG status) noexcept;

}  // namespace qsrfhs
