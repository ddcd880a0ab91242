// MKL's own memory: given back by each thread that used it, and once more when the process ends, unless other threads
// still compute. SPDX-License-Identifier: MIT
#pragma once

#include "qsrfhs/math/mkl_section.hpp"

namespace qsrfhs::mkl_runtime {

/// Held while a thread computes with MKL. The first one sets the thread up, and arranges for its clean-up.
class use {
 public:
  use() noexcept { mkl_section::begin_use(); }
  ~use() { mkl_section::end_use(); }
  use(const use &) = delete;
  use &operator=(const use &) = delete;
};

}  // namespace qsrfhs::mkl_runtime
