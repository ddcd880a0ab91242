// LAPACK routines that fail on demand. Only for executables whose calls of them are wrapped by the linker.
// SPDX-License-Identifier: MIT
#pragma once

namespace tests::lapack_faults {

/// While it lives, the n-th call (from 1) does nothing but tell `info`. Not to be nested.
class [[nodiscard]] fail_at {
 public:
  fail_at(int n, int info) noexcept;
  fail_at(const fail_at &) = delete;
  fail_at &operator=(const fail_at &) = delete;
  ~fail_at();
};

/// Calls since the last fail_at was made.
int calls() noexcept;

}  // namespace tests::lapack_faults
