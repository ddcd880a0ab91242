// One side's wait for a number of bytes that the other side makes. SPDX-License-Identifier: MIT
#pragma once

#include <immintrin.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <mutex>

#include "platform/processor.hpp"

namespace qsrfhs {

/// The number waited for is the event, too: it is 0 once granted. A wait that ends early therefore leaves nothing
/// behind that could end the next one.
class wanted_bytes {
 public:
  void want(std::uint32_t bytes) noexcept { bytes_.store(bytes); }
  /// Takes the wish back; true when it had been granted.
  bool withdraw() noexcept { return bytes_.exchange(0) == 0; }

  /// Grants a wish that `available(bytes)` agrees with.
  template <class Available>
  void grant_if(Available available) noexcept {
    std::uint32_t bytes = bytes_.load();
    if (bytes == 0 || !available(bytes) || !bytes_.compare_exchange_strong(bytes, 0)) return;
    // Either the waiter has announced itself by now, or it has not looked at the number yet.
    if (sleepers_.load() == 0) return;
    { const std::lock_guard lock(mutex_); }
    granted_.notify_all();
  }

  /// True once granted; false when time is over, and then the wish is gone.
  bool wait_for(std::chrono::milliseconds time) noexcept {
    if (granted_soon()) return true;
    std::unique_lock lock(mutex_);
    ++sleepers_;
    const bool granted = granted_.wait_for(lock, time, [this] { return bytes_.load() == 0; });
    --sleepers_;
    return granted || withdraw();
  }

 private:
  /// Looks for some microseconds before going to sleep, which costs more. Not worth it on a single processor.
  bool granted_soon() const noexcept {
    static const int rounds = platform::processor_count() > 1 ? 100 : 1;
    for (int round = 0; round < rounds; ++round) {
      if (bytes_.load() == 0) return true;
      _mm_pause();
    }
    return false;
  }

  std::atomic<std::uint32_t> bytes_{0};
  std::atomic<int> sleepers_{0};
  std::mutex mutex_;
  std::condition_variable granted_;
};

}  // namespace qsrfhs
