// Allocations that fail on demand: replaces every form of operator new. SPDX-License-Identifier: MIT
#pragma once

namespace tests::memory_faults {

/// While it lives, allocations of all threads are counted and the n-th one (from 1; 0 for none) fails. Not to be
/// nested; expectations of the test framework allocate, too, and belong behind its scope.
class [[nodiscard]] fail_at {
 public:
  explicit fail_at(int n) noexcept;
  fail_at(const fail_at &) = delete;
  fail_at &operator=(const fail_at &) = delete;
  ~fail_at();
};

/// Allocations since the last fail_at was made.
int calls() noexcept;

/// Allocations that have not been freed.
long live() noexcept;

}  // namespace tests::memory_faults
