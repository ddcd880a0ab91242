// One side's wait for a number of bytes that the other side makes. SPDX-License-Identifier: MIT
#pragma once

#include <immintrin.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <mutex>

#include "platform/fork.hpp"
#include "platform/processor.hpp"

namespace qsrfhs {

/// The wish is the event, too: it is gone once granted. A wait that ends early therefore leaves nothing behind that
/// could end the next one; and wishes are numbered, so that a late grant does not hit a later wish for as many bytes.
class wanted_bytes {
 public:
  using wish = std::uint64_t;

  /// Not by two threads at once. bytes is not 0.
  wish want(std::uint32_t bytes) noexcept {
    const wish made = std::uint64_t{++number_} << 32 | bytes;
    wish_.store(made);
    return made;
  }
  /// Takes a wish back; true when it had been granted.
  bool withdraw(wish made) noexcept { return !wish_.compare_exchange_strong(made, 0); }

  /// Grants a wish that `available(bytes)` agrees with.
  template <class Available>
  void grant_if(Available available) noexcept {
    wish made = wish_.load();
    if (made == 0 || !available(static_cast<std::uint32_t>(made))) return;
    if (!wish_.compare_exchange_strong(made, 0)) return;
    // Either the waiter has announced itself by now, or it has not looked at its wish yet.
    if (sleepers_.load() == 0) return;
    { const std::lock_guard lock(mutex_); }
    granted_.notify_all();
  }

  /// True once granted; false when time is over, and then the wish is gone.
  bool wait_for(wish made, std::chrono::milliseconds time) noexcept {
    if (granted_soon(made)) return true;
    std::unique_lock lock(mutex_);
    ++sleepers_;
    const bool granted = granted_.wait_for(lock, time, [&] { return wish_.load() != made; });
    --sleepers_;
    return granted || withdraw(made);
  }

  void before_fork() noexcept { mutex_.lock(); }
  void after_fork_in_parent() noexcept { mutex_.unlock(); }
  /// Nobody waits in the child.
  void after_fork_in_child() noexcept {
    wish_.store(0);
    sleepers_.store(0);
    platform::make_anew(granted_);
    mutex_.unlock();
  }

 private:
  // Made while the library is loaded; before that nobody waits.
  static inline const int rounds = platform::processor_count() > 1 ? 100 : 1;

  /// Looks for some microseconds before going to sleep, which costs more. Not worth it on a single processor.
  bool granted_soon(wish made) const noexcept {
    for (int round = 0; round < rounds; ++round) {
      if (wish_.load() != made) return true;
      _mm_pause();
    }
    return false;
  }

  std::atomic<wish> wish_{0};  // 0 for none
  std::uint32_t number_ = 0;   // of the latest wish
  std::atomic<int> sleepers_{0};
  std::mutex mutex_;
  std::condition_variable granted_;
};

}  // namespace qsrfhs
