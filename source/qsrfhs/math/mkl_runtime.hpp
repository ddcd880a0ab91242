// MKL's own memory: given back by each thread that used it, and once more when the process ends.
// SPDX-License-Identifier: MIT
#pragma once

namespace qsrfhs::mkl_runtime {

/// A computation of the calling thread begins or ends. The first one sets the thread up, and arranges for its clean-up.
void begin_use() noexcept;
void end_use() noexcept;

/// Held while a thread computes with MKL.
class use {
 public:
  use() noexcept { begin_use(); }
  ~use() { end_use(); }
  use(const use &) = delete;
  use &operator=(const use &) = delete;
};

}  // namespace qsrfhs::mkl_runtime
