// SPDX-License-Identifier: MIT
#include "qsrfhs/util/thread_pool.hpp"

#include <condition_variable>
#include <mutex>
#include <queue>
#include <system_error>

namespace ctpl {

struct thread_pool::state {
  std::mutex mutex;
  std::condition_variable changed;
  std::queue<std::function<void(std::int32_t)>> tasks;  // under mutex
  bool done = false;                                    // under mutex: drain the queue, then leave
};

thread_pool::thread_pool(std::int32_t workers) : state_(std::make_shared<state>()) {
  try {
    resize(workers);
  } catch (...) {
    finish();
    throw;
  }
}

thread_pool::~thread_pool() {
  stop();
}

void thread_pool::enqueue(std::function<void(std::int32_t)> task) {
  {
    const std::lock_guard lock(state_->mutex);
    state_->tasks.push(std::move(task));
  }
  state_->changed.notify_one();
}

void thread_pool::resize(std::int32_t workers) {
  {
    const std::lock_guard lock(state_->mutex);
    if (state_->done) return;
  }
  const auto wanted = static_cast<std::size_t>(workers < 0 ? 0 : workers);
  threads_.reserve(wanted);
  stop_flags_.reserve(wanted);
  while (threads_.size() < wanted) {
    auto leave = std::make_shared<std::atomic<bool>>(false);
    const auto worker = static_cast<std::int32_t>(threads_.size());
    threads_.emplace_back([shared = state_, leave, worker] { work(*shared, *leave, worker); });
    stop_flags_.push_back(std::move(leave));
  }
  if (threads_.size() > wanted) {
    for (std::size_t i = wanted; i < threads_.size(); ++i) {
      {
        const std::lock_guard lock(state_->mutex);  // no worker may miss the flag between its test and its wait
        *stop_flags_[i] = true;
      }
      threads_[i].detach();
    }
    state_->changed.notify_all();
    threads_.resize(wanted);
    stop_flags_.resize(wanted);
  }
}

void thread_pool::work(state &shared, const std::atomic<bool> &leave, std::int32_t worker) {
  std::unique_lock lock(shared.mutex);
  for (;;) {
    shared.changed.wait(lock, [&] { return !shared.tasks.empty() || shared.done || leave; });
    if (leave || shared.tasks.empty()) return;
    {
      const std::function<void(std::int32_t)> task = std::move(shared.tasks.front());
      shared.tasks.pop();
      lock.unlock();
      task(worker);  // an exception ends up in the task's future
    }
    lock.lock();
  }
}

void thread_pool::stop() {
  for (const std::thread &thread : threads_)
    if (thread.get_id() == std::this_thread::get_id())
      throw std::system_error(std::make_error_code(std::errc::resource_deadlock_would_occur));
  finish();
}

void thread_pool::finish() noexcept {
  {
    const std::lock_guard lock(state_->mutex);
    if (state_->done) return;
    state_->done = true;
  }
  state_->changed.notify_all();
  for (std::thread &thread : threads_) thread.join();
  threads_.clear();
  stop_flags_.clear();
}

}  // namespace ctpl
