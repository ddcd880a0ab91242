// Elements as the kernels take them. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/host_array.h>

#include <span>

#include "qsrfhs/vector/kernels/kernels.hpp"

namespace qsrfhs {

inline float *floats(std::span<float> elements) noexcept {
  return elements.data();
}
inline float *floats(std::span<lumra_cf32> elements) noexcept {
  return reinterpret_cast<float *>(elements.data());
}

}  // namespace qsrfhs
