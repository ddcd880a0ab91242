// A session's log: a bounded queue of failures that readers wait on. SPDX-License-Identifier: MIT
#pragma once

#include <condition_variable>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "platform/fork.hpp"

namespace qsrfhs::log {

struct entry {
  std::int32_t line;
  const char *file;  // static storage
  std::string message;
};

class Logger {
 public:
  /// Appends an entry and wakes one reader; dropped once closed. Beyond 10001 entries the oldest goes first.
  void add(entry e);
  /// Waits for the oldest entry; empty once closed.
  std::optional<entry> pop();
  /// Drops all entries and wakes all readers; from then on nothing is found.
  void close();

  void before_fork() noexcept { mutex_.lock(); }
  void after_fork_in_parent() noexcept { mutex_.unlock(); }
  void after_fork_in_child() noexcept {
    platform::make_anew(changed_);
    mutex_.unlock();
  }

 private:
  std::mutex mutex_;
  std::condition_variable changed_;
  std::unique_ptr<std::deque<entry>> queue_ = std::make_unique<std::deque<entry>>();  // under mutex_; null once closed
};

}  // namespace qsrfhs::log
