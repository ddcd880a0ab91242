// A fixed set of worker threads that serve one queue of tasks. SPDX-License-Identifier: MIT
#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <future>
#include <memory>
#include <thread>
#include <type_traits>
#include <utility>
#include <vector>

namespace ctpl {

class thread_pool {
 public:
  explicit thread_pool(std::int32_t workers);
  thread_pool(const thread_pool &) = delete;
  thread_pool &operator=(const thread_pool &) = delete;
  ~thread_pool();

  /// Queues task(worker index); its result or exception arrives in the future.
  template <class Task>
  auto push(Task &&task) -> std::future<std::invoke_result_t<Task &, std::int32_t>> {
    using result = std::invoke_result_t<Task &, std::int32_t>;
    auto packaged = std::make_shared<std::packaged_task<result(std::int32_t)>>(std::forward<Task>(task));
    auto future = packaged->get_future();
    enqueue([packaged](std::int32_t worker) { (*packaged)(worker); });
    return future;
  }

  /// Starts workers, or lets those beyond `workers` finish their task and leave. Nothing once stopped. Not to be called
  /// by two threads at once, nor beside stop().
  void resize(std::int32_t workers);

  /// Runs what is queued, then joins the workers. Nothing once stopped. From one of the pool's own workers it throws
  /// the standard error for a deadlock.
  void stop();

  [[nodiscard]] std::int32_t size() const noexcept { return static_cast<std::int32_t>(threads_.size()); }

 private:
  // Shared with the workers, so that one that was let go may outlive the pool.
  struct state;
  using stop_flag = std::shared_ptr<std::atomic<bool>>;

  void finish() noexcept;
  void enqueue(std::function<void(std::int32_t)> task);
  static void work(state &shared, const std::atomic<bool> &leave, std::int32_t worker);

  std::shared_ptr<state> state_;
  std::vector<std::thread> threads_;
  std::vector<stop_flag> stop_flags_;
};

}  // namespace ctpl
