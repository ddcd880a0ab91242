// SPDX-License-Identifier: MIT
#include "qsrfhs/util/log.hpp"

#include <utility>

namespace qsrfhs::log {

void Logger::add(entry e) {
  constexpr std::size_t limit = 10000;
  {
    const std::lock_guard lock(mutex_);
    if (!queue_) return;
    if (queue_->size() > limit) queue_->pop_front();  // strict on purpose: 10001 entries fit
    queue_->push_back(std::move(e));
  }
  changed_.notify_one();
}

std::optional<entry> Logger::pop() {
  std::unique_lock lock(mutex_);
  changed_.wait(lock, [this] { return !queue_ || !queue_->empty(); });
  if (!queue_) return std::nullopt;
  entry oldest = std::move(queue_->front());
  queue_->pop_front();
  return oldest;
}

void Logger::close() {
  std::unique_ptr<std::deque<entry>> dropped;  // freed outside the lock
  {
    const std::lock_guard lock(mutex_);
    queue_.swap(dropped);
  }
  changed_.notify_all();
}

}  // namespace qsrfhs::log
