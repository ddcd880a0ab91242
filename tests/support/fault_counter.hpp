// Calls that fail on demand, of whatever kind: one counter says which. SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>

#include <atomic>

namespace tests {

/// Calls of one kind, of all threads.
class fault_counter {
 public:
  /// Calls since a fail_at was last made.
  [[nodiscard]] int calls() const noexcept { return count_; }
  /// What such calls have made and nobody has freed.
  std::atomic<long> live{0};

  /// Counts a call; true for the one that is to fail.
  bool fails() noexcept { return armed_ && ++count_ == failing_; }
  [[nodiscard]] int status() const noexcept { return status_; }

 private:
  friend class fail_at;
  std::atomic<bool> armed_{false};
  std::atomic<int> count_{0}, failing_{0}, status_{0};
};

/// While it lives, calls are counted and the n-th one (from 1; 0 for none) fails, with the status where the kind has
/// several. Not to be nested; expectations of the test framework allocate, too, and belong behind its scope.
class [[nodiscard]] fail_at {
 public:
  fail_at(fault_counter &kind, int n, int status = 0) noexcept : kind_(kind) {
    kind.count_ = 0;
    kind.failing_ = n;
    kind.status_ = status;
    kind.armed_ = true;
  }
  fail_at(const fail_at &) = delete;
  fail_at &operator=(const fail_at &) = delete;
  ~fail_at() { kind_.armed_ = false; }

 private:
  fault_counter &kind_;
};

/// Runs work with the n-th call failing, for every n until there are no more; check sees what work returned, and
/// whether a call failed. The number of calls.
template <class Work, class Check>
int fail_each(fault_counter &kind, Work work, Check check) {
  for (int n = 1;; ++n) {
    SCOPED_TRACE(n);
    const auto returned = [&] {
      const fail_at armed(kind, n);
      return work();
    }();
    const bool failed = kind.calls() >= n;
    check(returned, failed);
    if (!failed) return n - 1;
  }
}

/// Of what is made while it lives, nothing is left in the end.
class nothing_left {
 public:
  explicit nothing_left(const fault_counter &kind) : kind_(kind) {
    { SCOPED_TRACE("what the framework keeps of the first one"); }
    before_ = kind.live;
  }
  nothing_left(const nothing_left &) = delete;
  nothing_left &operator=(const nothing_left &) = delete;
  ~nothing_left() { EXPECT_EQ(before_, kind_.live); }

 private:
  const fault_counter &kind_;
  long before_ = 0;
};

}  // namespace tests
