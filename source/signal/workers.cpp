// SPDX-License-Identifier: MIT
#include "signal/workers.hpp"

#include <algorithm>
#include <atomic>
#include <exception>
#include <latch>
#include <vector>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"
#include "platform/processor.hpp"
#include "qsrfhs/util/thread_pool.hpp"

namespace dsp {
namespace {

class workers {
 public:
  static workers &instance() noexcept {
    static platform::immortal<workers> shared;
    return shared.get();
  }
  workers() : pool_(platform::processor_count()) {}

  ctpl::thread_pool &pool() noexcept { return pool_; }

  void before_fork() noexcept { pool_.before_fork(); }
  void after_fork_in_parent() noexcept { pool_.after_fork_in_parent(); }
  /// Tasks refer to the stacks of threads that are not there.
  void after_fork_in_child() noexcept {
    pool_.after_fork_in_child();
    pool_.forget_tasks();
  }

 private:
  ctpl::thread_pool pool_;  // no thread before the first task
};

const platform::fork_participant<workers> takes_part(platform::fork_rank::shared_workers);

/// Parts that are handed out one by one.
class handed_out {
 public:
  handed_out(std::size_t count, const std::function<void(std::size_t)> &part) : part_(part), failures_(count) {}

  void run() noexcept {
    for (std::size_t k = next_++; k < failures_.size(); k = next_++) {
      try {
        part_(k);
      } catch (...) {
        failures_[k] = std::current_exception();
      }
    }
  }
  void throw_first() const {
    for (const std::exception_ptr &failure : failures_)
      if (failure) std::rethrow_exception(failure);
  }

 private:
  const std::function<void(std::size_t)> &part_;
  std::atomic<std::size_t> next_ = 0;
  std::vector<std::exception_ptr> failures_;
};

}  // namespace

std::size_t thread_count(std::size_t wanted) noexcept {
  return wanted != 0 ? wanted : static_cast<std::size_t>(platform::processor_count());
}

void run_parts(std::size_t parts, const std::function<void(std::size_t)> &part) {
  handed_out all(parts, part);
  std::ptrdiff_t queued = 0;
  const auto most = std::max<std::ptrdiff_t>(static_cast<std::ptrdiff_t>(parts) - 1, 0);
  std::latch running(most);
  try {
    for (; queued < most; ++queued)
      workers::instance().pool().post([&](std::int32_t) {
        all.run();
        running.count_down();
      });
  } catch (const std::exception &) {
    running.count_down(most - queued);  // those that there are share the work
  }
  all.run();
  running.wait();
  all.throw_first();
}

}  // namespace dsp
