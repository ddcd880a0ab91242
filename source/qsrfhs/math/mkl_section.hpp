// Where MKL takes locks of its own: its memory is under one, and what it does once for the process or for a thread. No
// handler of a fork can free those in the child, so a fork waits until nobody is in such a section, and nobody enters
// one meanwhile. A section is as long as one call of MKL's, or lets forks pass. SPDX-License-Identifier: MIT
#pragma once

#include <atomic>

namespace qsrfhs {

/// A fork waits for the sections to end.
extern constinit std::atomic<bool> mkl_gate_closed;

/// Costs some nanoseconds. May be nested. No lock of the library is taken inside, and no foreign code is called.
class mkl_section {
 public:
  mkl_section() noexcept;
  ~mkl_section();
  mkl_section(const mkl_section &) = delete;
  mkl_section &operator=(const mkl_section &) = delete;

  /// Between two calls of MKL's in an outermost section: a fork that waits goes first.
  void let_forks_pass() noexcept {
    if (mkl_gate_closed.load(std::memory_order_relaxed)) pass();
  }

  // For mkl_runtime: a computation of the calling thread begins or ends, and whether any thread has one under way. The
  // first one of a thread lets MKL set itself up inside of a section.
  static void begin_use() noexcept;
  static void end_use() noexcept;
  [[nodiscard]] static bool in_use() noexcept;

 private:
  void pass() noexcept;

  void *thread_;
};

}  // namespace qsrfhs
