// Transform calls that fail on demand. Only for executables whose calls of DFTI are wrapped by the linker.
// SPDX-License-Identifier: MIT
#pragma once

namespace tests::mkl_faults {

/// While it lives, DFTI calls are counted and the n-th one (from 1; 0 for none) fails with DFTI_MEMORY_ERROR. A call to
/// free a descriptor that fails has freed it nevertheless. Not to be nested.
class [[nodiscard]] fail_at {
 public:
  explicit fail_at(int n) noexcept;
  fail_at(const fail_at &) = delete;
  fail_at &operator=(const fail_at &) = delete;
  ~fail_at();
};

/// DFTI calls since the last fail_at was made.
int calls() noexcept;

/// Descriptors made and not freed since the test began.
int live_descriptors() noexcept;

}  // namespace tests::mkl_faults
