// SPDX-License-Identifier: MIT
#pragma once

#include <pthread.h>

namespace platform {

/// A thread of the library's own. Unlike std::thread it keeps nothing on the heap, which would have no owner in the
/// child of a fork, and it can be forgotten there.
class thread {
 public:
  using routine = void *(*)(void *);

  thread() noexcept = default;
  /// Throws std::system_error where the system has no thread to give.
  thread(routine run, void *argument);
  thread(const thread &) = delete;
  thread &operator=(const thread &) = delete;
  thread &operator=(thread &&from) noexcept;
  /// Joined, detached or forgotten before.
  ~thread() = default;

  [[nodiscard]] bool joinable() const noexcept { return joinable_; }
  [[nodiscard]] bool is_current() const noexcept { return joinable_ && pthread_equal(id_, pthread_self()) != 0; }
  void join() noexcept;
  void detach() noexcept;
  /// For the child of a fork, where the thread does not exist.
  void forget() noexcept { joinable_ = false; }

 private:
  pthread_t id_{};
  bool joinable_ = false;
};

/// Frames what other libraries do when a thread that asked for it ends: calls begin() before the destructors of their
/// thread-specific data, where those were made after this, and end() behind them.
class thread_end {
 public:
  thread_end(void (*begin)() noexcept, void (*end)() noexcept) noexcept;
  thread_end(const thread_end &) = delete;
  thread_end &operator=(const thread_end &) = delete;

  /// For the calling thread. False where the system keeps no more of such data.
  [[nodiscard]] bool ask() noexcept { return set(begin_); }

 private:
  struct step {
    thread_end *of;
    void (*call)() noexcept;
    step *following;
  };
  static void take(void *value) noexcept;
  bool set(step &next) noexcept;

  step begin_, end_;
  pthread_key_t key_{};
  bool has_key_;
};

/// True where the system has fence_all_threads().
bool has_fence_for_all_threads() noexcept;

/// Lets every thread of the process pass a full memory barrier, so that those on a hot path need none of their own.
void fence_all_threads() noexcept;

/// Gives the calling thread the highest ordinary priority, as far as the process may.
void raise_thread_priority() noexcept;

}  // namespace platform
