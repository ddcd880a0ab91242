// A fixed set of worker threads that serve one queue of tasks. They are started by the first task: a pool that nobody
// gives one has no threads. In the child of a fork they are started anew; tasks that were queued will run there, too,
// those that were running are over. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <functional>
#include <future>
#include <memory>
#include <type_traits>
#include <utility>

namespace ctpl {

class thread_pool {
 public:
  explicit thread_pool(std::int32_t workers);
  thread_pool(const thread_pool &) = delete;
  thread_pool &operator=(const thread_pool &) = delete;
  ~thread_pool();

  /// Queues task(worker index); its result or exception arrives in the future. Throws the system's error where no
  /// worker can be started, std::bad_alloc.
  template <class Task>
  auto push(Task &&task) -> std::future<std::invoke_result_t<Task &, std::int32_t>> {
    using result = std::invoke_result_t<Task &, std::int32_t>;
    auto packaged = std::make_shared<std::packaged_task<result(std::int32_t)>>(std::forward<Task>(task));
    auto future = packaged->get_future();
    post([packaged](std::int32_t worker) { (*packaged)(worker); });
    return future;
  }

  /// Sets the number of workers; those beyond it finish their task and leave. Nothing once stopped. Not to be called by
  /// two threads at once, nor beside stop().
  void resize(std::int32_t workers);

  /// Runs what is queued, then joins the workers. Nothing once stopped. From one of the pool's own workers it throws
  /// the standard error for a deadlock.
  void stop();

  /// Workers that serve the pool, or will once there is a task.
  [[nodiscard]] std::int32_t size() const noexcept;

  void before_fork() noexcept;
  void after_fork_in_parent() noexcept;
  void after_fork_in_child() noexcept;

 private:
  struct state;
  struct member;
  using job = std::function<void(std::int32_t)>;

  /// Queues work that throws nothing.
  void post(job added);

  void finish() noexcept;
  static void start_missing(state &shared);
  static void *serve(void *own);

  state *shared_;
};

}  // namespace ctpl
