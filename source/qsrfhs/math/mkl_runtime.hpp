// MKL's own memory: given back by each thread that used it, and once more when the process ends.
// SPDX-License-Identifier: MIT
#pragma once

namespace qsrfhs::mkl_runtime {

/// Held while a thread computes with MKL. The first one of a thread arranges for its clean-up.
class use {
 public:
  use() noexcept;
  ~use();
  use(const use &) = delete;
  use &operator=(const use &) = delete;
};

}  // namespace qsrfhs::mkl_runtime
