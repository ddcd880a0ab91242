// What a caller's transform slot points to: a committed MKL descriptor. SPDX-License-Identifier: MIT
#pragma once

#include <mkl_dfti.h>

namespace toolkit {

struct cached_transform {
  DFTI_DESCRIPTOR_HANDLE descriptor = nullptr;
};

enum transform_status : int { transform_ok = 0, transform_free_failed = -359503 };

/// Frees what the slot holds and sets it to null, whatever MKL says of it.
int release(void **slot) noexcept;

}  // namespace toolkit
