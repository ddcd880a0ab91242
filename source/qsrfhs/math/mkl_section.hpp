// Where MKL takes locks of its own: its memory is under one, and what it does once for the process or for a thread. No
// handler of a fork can free those in the child, so a fork waits until nobody is in such a section, and nobody enters
// one meanwhile. A section is as long as one call of MKL's, or lets forks pass. SPDX-License-Identifier: MIT
#pragma once

#include <atomic>

namespace qsrfhs {

/// A fork waits for the sections to end.
extern constinit std::atomic<bool> mkl_gate_closed;

/// What a thread says of itself.
struct mkl_thread {
  enum class stage { fresh, known, ended };

  std::atomic<bool> inside{false};
  std::atomic<int> uses{0};  // only this thread writes it: all threads counting in one place would cost too much
  stage at = stage::fresh;
  int depth = 0;
  mkl_thread *older = nullptr, *newer = nullptr;  // in the list of all that may be inside

  /// In the memory that a thread has from its start: looking it up takes one instruction.
  [[gnu::tls_model("initial-exec")]] static constinit thread_local mkl_thread own;
};

/// Costs a few nanoseconds. May be nested. No lock of the library is taken inside, and no foreign code is called.
class mkl_section {
 public:
  mkl_section() noexcept { enter(); }
  ~mkl_section() { leave(); }
  mkl_section(const mkl_section &) = delete;
  mkl_section &operator=(const mkl_section &) = delete;

  /// Between two calls of MKL's in an outermost section: a fork that waits goes first.
  void let_forks_pass() noexcept {
    if (mkl_gate_closed.load(std::memory_order_relaxed)) pass();
  }

  // For the end of a thread, whose last section begins and ends in two functions.
  static void enter() noexcept {
    mkl_thread &self = mkl_thread::own;
    if (self.at == mkl_thread::stage::fresh) [[unlikely]]
      set_up();
    if (self.depth++ > 0 || self.at != mkl_thread::stage::known) return;
    if (forks_fence) {
      self.inside.store(true, std::memory_order_relaxed);
      std::atomic_signal_fence(std::memory_order_seq_cst);
    } else {
      self.inside.store(true);
    }
    if (mkl_gate_closed.load()) [[unlikely]]
      wait_for_fork();
  }
  static void leave() noexcept {
    if (--mkl_thread::own.depth == 0) mkl_thread::own.inside.store(false, std::memory_order_release);
  }

  // For mkl_runtime: a computation of the calling thread begins or ends, and whether any thread has one under way. The
  // first one of a thread lets MKL set itself up inside of a section.
  static void begin_use() noexcept {
    if (mkl_thread::own.at == mkl_thread::stage::fresh) [[unlikely]]
      set_up();
    count_use(1);
  }
  static void end_use() noexcept { count_use(-1); }
  [[nodiscard]] static bool in_use() noexcept;

 private:
  static void set_up() noexcept;
  static void wait_for_fork() noexcept;
  static void pass() noexcept;
  static void count_use(int change) noexcept {
    if (mkl_thread &self = mkl_thread::own; self.at == mkl_thread::stage::known)
      self.uses.store(self.uses.load(std::memory_order_relaxed) + change, std::memory_order_relaxed);
    else
      uses_of_others.fetch_add(change, std::memory_order_relaxed);
  }

  /// Whether a fork lets the threads pass the barrier between saying that they are inside and looking at the gate.
  static const bool forks_fence;
  static constinit std::atomic<int> uses_of_others;  // by threads that are in no list
};

}  // namespace qsrfhs
