// Two teams of threads for parallel element loops. A batch is an array of task records of one size, which the caller
// owns; the caller waits until all are done. In shared mode any idle thread takes the next record of the oldest batch,
// in pinned mode each record names the thread that must run it.
//
// A team is started by the first batch that needs it, not when the library is first used: a process that only reads the
// error list pays for no thread. SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <mutex>

#include "platform/thread.hpp"

namespace qsrfhs {

class batch_scheduler {
 public:
  /// Shared mode: work(record, null). Pinned mode: work(base + index * record size, record), where the record holds the
  /// slot in its second 32-bit word, its index in the 64-bit word at offset 8, and room for an address at offset 16.
  using worker = void (*)(void *record, void *task);
  /// Records a code and returns it; called without the lock.
  using recorder = std::int32_t (*)(std::int32_t code);

  static constexpr std::int32_t shared_mode = 1, pinned_mode = 2;  // any other value counts as shared
  static constexpr std::int32_t max_threads = 32;
  static constexpr std::size_t batch_count = 32, ring_size = 32;

  /// `mutex` guards every field. `limit`: how long a caller waits for a batch to be taken in, and to be done.
  batch_scheduler(std::mutex &mutex, std::int32_t cpu_count, recorder record,
                  std::chrono::milliseconds limit = std::chrono::seconds(10)) noexcept;
  batch_scheduler(const batch_scheduler &) = delete;
  batch_scheduler &operator=(const batch_scheduler &) = delete;
  ~batch_scheduler() { stop(); }

  /// Returns 0 once all records are done. After a time-out the tasks are not cancelled: those that run go on, those
  /// that wait will still be run. Two callers must not use pinned mode at once, nor one beside a shared batch: both may
  /// hold the same batch.
  /// In shared mode the caller runs a further record meanwhile, `own`, where it has one, and helps with the others.
  std::int32_t RunBatch(worker work, void *records, std::uint32_t count, std::size_t record_size, std::int32_t mode,
                        void *own = nullptr);

  /// Lets all threads leave and joins them. One that is busy for longer than a second is left alone. Records in
  /// shared mode run in their caller from then on, those in pinned mode do not run.
  void stop() noexcept;

  /// Starts afresh in the child of a fork, where no thread has survived. The mutex is held.
  void forget_threads() noexcept;

  [[nodiscard]] std::int32_t running(std::int32_t mode) const;

 private:
  enum class team_kind { shared, pinned };

  struct batch {
    batch *following = nullptr;
    std::byte *base = nullptr;
    std::uint32_t count = 0;                 // of records
    std::uint32_t next = 0;                  // first record not handed out
    std::atomic<std::int32_t> remaining{0};  // records not finished; changed without the lock too
    bool in_use = false;                     // the caller still waits
    bool done = false;                       // the completion event
    std::condition_variable completed;
    worker work = nullptr;
    std::size_t record_size = 0;
  };

  /// Place of a thread in its team.
  struct slot {
    batch_scheduler *scheduler = nullptr;
    platform::thread thread;
    bool occupied = false;  // a thread was made and has not left
    bool stop = false;
    // Pinned team only.
    std::condition_variable wake;
    std::array<void *, ring_size> ring{};
    std::size_t read = 0, write = 0;
  };

  struct team {
    std::array<slot, max_threads> slots;
    std::int32_t running = 0;
  };

  /// Everything that ends with the threads.
  struct state {
    state() noexcept;
    std::array<batch, batch_count> batches;
    batch *free = nullptr;
    batch *active = nullptr;  // oldest first
    bool work_event = false;
    std::condition_variable work_wake;  // shared team
    std::condition_variable thread_left;
    team shared, pinned;
    bool stopping = false;
  };

  class membership;

  std::int32_t run_shared(worker work, void *records, std::uint32_t count, std::size_t record_size, void *own);
  std::int32_t run_pinned(worker work, void *records, std::uint32_t count, std::size_t record_size);
  bool start_team(team_kind kind);
  void fill(batch &filled, worker work, void *records, std::uint32_t count, std::size_t record_size) noexcept;
  static bool await(std::unique_lock<std::mutex> &lock, batch &awaited, std::chrono::steady_clock::time_point until);
  static void take_part(std::unique_lock<std::mutex> &lock, batch &submitted, void *own);
  batch *take_task(std::uint32_t &index, bool &more) noexcept;
  void set_work_event() noexcept;
  void serve_shared(slot &own);
  void serve_pinned(slot &own);
  void finish_task(batch &of);

  /// A thread's routine; its argument is its slot.
  template <void (batch_scheduler::*service)(slot &)>
  static void *serve(void *own) {
    auto &place = *static_cast<slot *>(own);
    (place.scheduler->*service)(place);
    return nullptr;
  }

  std::mutex &mutex_;
  const std::int32_t cpu_count_;
  const recorder record_;
  const std::chrono::milliseconds limit_;
  state state_;  // under mutex_
};

}  // namespace qsrfhs
