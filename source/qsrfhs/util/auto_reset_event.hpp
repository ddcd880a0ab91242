// A flag that one thread sets and one waiting thread takes. SPDX-License-Identifier: MIT
#pragma once

#include <immintrin.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <mutex>

#include "platform/processor.hpp"

namespace qsrfhs {

/// Pauses for a few microseconds at most until done() holds; tells whether it does. What two threads wait for in one
/// another is mostly done by then, and sleeping and waking cost more. Not worth it on a single processor.
template <class Done>
bool spin_until(Done done, int rounds) noexcept {
  static const bool worth_it = platform::processor_count() > 1;
  if (!worth_it) rounds = 1;
  for (int round = 0; round < rounds; ++round) {
    if (done()) return true;
    _mm_pause();
  }
  return false;
}

class auto_reset_event {
 public:
  void set() noexcept {
    flag_.store(true);
    // Either the waiter has announced itself by now, or it has not looked at the flag yet.
    if (sleepers_.load() == 0) return;
    { const std::lock_guard lock(mutex_); }
    changed_.notify_one();
  }

  void reset() noexcept { flag_.store(false); }

  /// Takes the flag; false when nobody set it in that time.
  bool wait_for(std::chrono::milliseconds time) noexcept {
    constexpr int rounds = 100;
    if (spin_until([this] { return take(); }, rounds)) return true;
    std::unique_lock lock(mutex_);
    ++sleepers_;
    const bool taken = changed_.wait_for(lock, time, [this] { return take(); });
    --sleepers_;
    return taken;
  }

 private:
  bool take() noexcept { return flag_.load() && flag_.exchange(false); }

  std::atomic<bool> flag_{false};
  std::atomic<int> sleepers_{0};
  std::mutex mutex_;
  std::condition_variable changed_;
};

}  // namespace qsrfhs
