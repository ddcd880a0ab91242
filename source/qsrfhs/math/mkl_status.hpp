// The one rule by which an MKL status becomes an exception. SPDX-License-Identifier: MIT
#pragma once

#include <mkl_dfti.h>

#include "qsrfhs/math/exceptions.hpp"

namespace qsrfhs {

/// True unless the status is 0 or of the class without error.
[[nodiscard]] bool failed(MKL_LONG status) noexcept;

/// Throws mkl_error where the status is a failure.
void throw_if_failed(MKL_LONG status, source_position at);

}  // namespace qsrfhs
