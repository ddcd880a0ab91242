// SPDX-License-Identifier: MIT
#include "qsrfhs/util/thread_pool.hpp"

#include <algorithm>
#include <condition_variable>
#include <exception>
#include <list>
#include <mutex>
#include <system_error>

#include "platform/fork.hpp"
#include "platform/thread.hpp"

namespace ctpl {

struct thread_pool::member {
  member(state &served, std::int32_t number) noexcept : shared(served), index(number) {}
  state &shared;
  const std::int32_t index;
  bool dropped = false;  // leaves after its task, and nobody joins it
  platform::thread thread;
};

/// Belongs to the pool, and then to the workers that it dropped: the last of them frees it.
struct thread_pool::state {
  std::mutex mutex;
  // All under mutex.
  std::condition_variable changed;
  std::list<job> tasks;
  std::list<member> workers;  // started and not gone, the dropped ones included
  std::int32_t wanted = 0;
  bool done = false;  // drain the queue, then leave
  bool owned = true;  // by a pool
};

thread_pool::thread_pool(std::int32_t workers) : shared_(new state) {
  resize(workers);
}

thread_pool::~thread_pool() {
  stop();
  bool last = false;
  {
    const std::lock_guard lock(shared_->mutex);
    shared_->owned = false;
    last = shared_->workers.empty();
  }
  if (last) delete shared_;
}

std::int32_t thread_pool::size() const noexcept {
  const std::lock_guard lock(shared_->mutex);
  return shared_->wanted;
}

/// Starts as many of the missing workers as the system gives. Throws where it gives none, and there is none. Under the
/// mutex.
void thread_pool::start_missing(state &shared) {
  for (std::int32_t index = 0; index < shared.wanted; ++index) {
    const auto serves = [index](const member &each) { return each.index == index && !each.dropped; };
    if (std::any_of(shared.workers.begin(), shared.workers.end(), serves)) continue;
    member &added = shared.workers.emplace_back(shared, index);
    try {
      added.thread = platform::thread(&serve, &added);
    } catch (const std::system_error &) {
      shared.workers.pop_back();
      if (index == 0) throw;
      return;
    }
  }
}

void thread_pool::post(job added) {
  {
    const std::lock_guard lock(shared_->mutex);
    if (!shared_->done) start_missing(*shared_);
    shared_->tasks.push_back(std::move(added));
  }
  shared_->changed.notify_one();
}

void thread_pool::resize(std::int32_t workers) {
  {
    const std::lock_guard lock(shared_->mutex);
    if (shared_->done) return;
    shared_->wanted = std::max(workers, 0);
    for (member &each : shared_->workers) {
      if (each.index < shared_->wanted || each.dropped) continue;
      each.dropped = true;
      each.thread.detach();
    }
    if (!shared_->tasks.empty()) start_missing(*shared_);
  }
  shared_->changed.notify_all();
}

void *thread_pool::serve(void *own) {
  member &self = *static_cast<member *>(own);
  state &shared = self.shared;
  const std::int32_t index = self.index;
  std::unique_lock lock(shared.mutex);
  for (;;) {
    shared.changed.wait(lock, [&] { return !shared.tasks.empty() || shared.done || self.dropped; });
    if (self.dropped || shared.tasks.empty()) break;
    {
      const job next = std::move(shared.tasks.front());
      shared.tasks.pop_front();
      lock.unlock();
      next(index);  // an exception ends up in the task's future
    }
    lock.lock();
  }
  if (!self.dropped) return nullptr;  // to be joined
  shared.workers.remove_if([&](const member &each) { return &each == &self; });
  const bool last = !shared.owned && shared.workers.empty();
  lock.unlock();
  if (last) delete &shared;
  return nullptr;
}

void thread_pool::stop() {
  {
    const std::lock_guard lock(shared_->mutex);
    for (const member &each : shared_->workers)
      if (each.thread.is_current())
        throw std::system_error(std::make_error_code(std::errc::resource_deadlock_would_occur));
  }
  finish();
}

void thread_pool::finish() noexcept {
  std::list<member> leaving;
  {
    const std::lock_guard lock(shared_->mutex);
    if (shared_->done) return;
    try {
      if (!shared_->tasks.empty()) start_missing(*shared_);  // in the child of a fork there may be none
    } catch (const std::exception &) {
      // Nobody can run the tasks: they end with the pool.
    }
    shared_->done = true;
    for (auto next = shared_->workers.begin(); next != shared_->workers.end();) {
      const auto each = next++;
      if (!each->dropped) leaving.splice(leaving.end(), shared_->workers, each);
    }
  }
  shared_->changed.notify_all();
  for (member &each : leaving) each.thread.join();
}

void thread_pool::before_fork() noexcept {
  shared_->mutex.lock();
}

void thread_pool::after_fork_in_parent() noexcept {
  shared_->mutex.unlock();
}

void thread_pool::after_fork_in_child() noexcept {
  shared_->workers.clear();
  platform::make_anew(shared_->changed);
  shared_->mutex.unlock();
}

}  // namespace ctpl
