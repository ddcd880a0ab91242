// SPDX-License-Identifier: MIT
#include "signal/workers.hpp"

#include <immintrin.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <exception>
#include <mutex>
#include <system_error>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"
#include "platform/processor.hpp"
#include "platform/thread.hpp"

namespace dsp {
namespace {

/// Whether something comes true while a thread would at most fall asleep and be woken again, which takes as long.
template <class Condition>
bool comes_soon(Condition condition) noexcept {
  constexpr std::chrono::microseconds soon(50);
  const auto begun = std::chrono::steady_clock::now();
  while (!condition()) {
    if (std::chrono::steady_clock::now() - begun > soon) return false;
    _mm_pause();
  }
  return true;
}

/// Parts that are handed out one by one, on the stack of the thread that wants them done.
class handed_out {
 public:
  handed_out(std::size_t parts, part_of_work part) noexcept : parts_(parts), first_failed_(parts), part_(part) {}

  void run() noexcept {
    for (std::size_t k = next_++; k < parts_; k = next_++) {
      try {
        part_(k);
      } catch (...) {
        keep_failure(k);
      }
    }
  }
  void throw_first() const {
    if (failure_) std::rethrow_exception(failure_);
  }

  /// How a worker rounds, and what it makes of denormals: as the thread does whose work it is.
  void compute_as_its_owner() const noexcept { _mm_setcsr(control_); }

  // For the workers, under their mutex.
  handed_out *following = nullptr;
  std::size_t wanted = 0;              // workers that may still come
  std::atomic<std::size_t> inside{0};  // workers that have come and not gone; read without the mutex, too

 private:
  void keep_failure(std::size_t k) noexcept {
    const std::lock_guard lock(failure_mutex_);
    if (k >= first_failed_) return;
    first_failed_ = k;
    failure_ = std::current_exception();
  }

  const unsigned control_ = _mm_getcsr();
  const std::size_t parts_;
  std::atomic<std::size_t> next_{0};
  std::mutex failure_mutex_;
  std::size_t first_failed_;  // under failure_mutex_ while others are inside, as the next
  std::exception_ptr failure_;
  part_of_work part_;
};

class workers {
 public:
  static workers &instance() noexcept {
    static platform::immortal<workers> shared;
    return shared.get();
  }

  void share(handed_out &parts, std::size_t others) noexcept {
    others = std::min(others, most_);
    if (others == 0) return parts.run();
    {
      const std::lock_guard lock(mutex_);
      start_missing(others);
      parts.wanted = others;
      *end() = &parts;
      offered_.fetch_add(1, std::memory_order_relaxed);
    }
    for (std::size_t k = 0; k < others; ++k) more_.notify_one();
    parts.run();
    withdraw(parts);
  }

  void before_fork() noexcept { mutex_.lock(); }
  void after_fork_in_parent() noexcept { mutex_.unlock(); }
  /// What is offered lies on the stacks of threads that are not there, as the workers are not.
  void after_fork_in_child() noexcept {
    started_ = 0;
    offers_ = nullptr;
    platform::make_anew(more_);
    platform::make_anew(left_);
    mutex_.unlock();
  }

 private:
  /// The place of the next offer, behind all others.
  handed_out **end() noexcept {
    handed_out **place = &offers_;
    while (*place) place = &(*place)->following;
    return place;
  }

  void start_missing(std::size_t wanted) noexcept {
    try {
      for (; started_ < wanted; ++started_) platform::thread(&begin, this).detach();
    } catch (const std::system_error &) {
      // Those that there are share the work; the next call tries again.
    }
  }

  /// No worker comes any more; waits for those that have come.
  void withdraw(handed_out &parts) noexcept {
    {
      const std::lock_guard lock(mutex_);
      remove(parts);
    }
    // They are about to end: each was at its last part when no other was left.
    comes_soon([&] { return parts.inside.load(std::memory_order_relaxed) == 0; });
    std::unique_lock lock(mutex_);
    left_.wait(lock, [&] { return parts.inside.load(std::memory_order_relaxed) == 0; });
  }

  void remove(handed_out &parts) noexcept {
    handed_out **place = &offers_;
    while (*place && *place != &parts) place = &(*place)->following;
    if (*place) *place = parts.following;
  }

  [[noreturn]] void serve() noexcept {
    std::unique_lock lock(mutex_);
    for (;;) {
      more_.wait(lock, [this] { return offers_ != nullptr; });
      handed_out &taken = *offers_;
      if (--taken.wanted == 0) offers_ = taken.following;
      taken.inside.fetch_add(1, std::memory_order_relaxed);
      lock.unlock();
      taken.compute_as_its_owner();
      taken.run();
      lock.lock();
      if (taken.inside.fetch_sub(1, std::memory_order_relaxed) == 1) left_.notify_all();
      if (offers_ != nullptr) continue;
      // Whoever goes over a record piece by piece brings the next one at once.
      const std::size_t seen = offered_.load(std::memory_order_relaxed);
      lock.unlock();
      comes_soon([&] { return offered_.load(std::memory_order_relaxed) != seen; });
      lock.lock();
    }
  }
  static void *begin(void *own) { static_cast<workers *>(own)->serve(); }

  const std::size_t most_ = static_cast<std::size_t>(platform::processor_count()) - 1;
  std::mutex mutex_;
  // All under mutex_.
  std::condition_variable more_, left_;
  handed_out *offers_ = nullptr;         // the oldest first
  std::atomic<std::size_t> offered_{0};  // how many there have been; read without the mutex, too
  std::size_t started_ = 0;
};

const platform::fork_participant<workers> takes_part(platform::fork_rank::shared_workers);

}  // namespace

std::size_t thread_count(std::size_t wanted) noexcept {
  return wanted != 0 ? wanted : static_cast<std::size_t>(platform::processor_count());
}

void run_parts(std::size_t parts, part_of_work part) {
  if (parts == 0) return;
  handed_out all(parts, part);
  workers::instance().share(all, parts - 1);
  all.throw_first();
}

}  // namespace dsp
