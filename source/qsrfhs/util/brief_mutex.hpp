// A mutex for a few instructions at a time. SPDX-License-Identifier: MIT
#pragma once

#include <immintrin.h>

#include <mutex>

#include "platform/processor.hpp"

namespace qsrfhs {

/// Looks for a microsecond or two whether the holder leaves, before it goes to sleep: that would take longer.
class brief_mutex {
 public:
  void lock() {
    for (int round = 0; round < rounds; ++round) {
      if (mutex_.try_lock()) return;
      _mm_pause();
    }
    mutex_.lock();
  }
  bool try_lock() { return mutex_.try_lock(); }
  void unlock() { mutex_.unlock(); }

 private:
  // Made while the library is loaded; before that nobody waits.
  static inline const int rounds = platform::processor_count() > 1 ? 50 : 1;

  std::mutex mutex_;
};

}  // namespace qsrfhs
