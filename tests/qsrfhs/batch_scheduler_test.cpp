// SPDX-License-Identifier: MIT
#include "qsrfhs/util/batch_scheduler.hpp"

#include <gtest/gtest.h>
#include <pthread.h>

#include <algorithm>
#include <atomic>
#include <cstring>
#include <latch>
#include <memory>
#include <thread>
#include <vector>

namespace {

using namespace std::chrono_literals;
using qsrfhs::batch_scheduler;

constexpr std::int32_t shared_timeout = -67436764, pinned_timeout = -67436752;
constexpr std::int32_t shared_thread_failed = -67436963, pinned_thread_failed = -67436809;

std::mutex codes_mutex;
std::vector<std::int32_t> codes;

std::int32_t record_code(std::int32_t code) {
  const std::lock_guard lock(codes_mutex);
  codes.push_back(code);
  return code;
}

/// A task record with the words that pinned mode reads and writes.
struct task {
  std::uint32_t unused = 0, slot = 0;
  std::uint64_t index = 0;
  void *header = nullptr;
  std::atomic<int> runs{0};
  std::thread::id ran_on;
};

std::unique_ptr<task[]> make_tasks(std::uint32_t count, std::uint32_t slots = 1) {
  auto tasks = std::make_unique<task[]>(count);
  for (std::uint32_t i = 0; i < count; ++i) {
    tasks[i].index = i;
    tasks[i].slot = i % slots;
  }
  return tasks;
}

void run(void *record, void * /*task*/) {
  auto &own = *static_cast<task *>(record);
  own.ran_on = std::this_thread::get_id();
  ++own.runs;
}

std::latch *gate = nullptr;
void wait_at_gate(void *record, void *task) {
  gate->wait();
  run(record, task);
}

void end_thread(void * /*record*/, void * /*task*/) {
  pthread_exit(nullptr);
}

class BatchSchedulerConcurrency : public testing::Test {
 protected:
  BatchSchedulerConcurrency() { codes.clear(); }

  static std::int32_t submit(batch_scheduler &scheduler, batch_scheduler::worker work, task *tasks, std::uint32_t count,
                             std::int32_t mode = batch_scheduler::shared_mode) {
    return scheduler.RunBatch(work, tasks, count, sizeof(task), mode);
  }

  static bool each_ran_once(const task *tasks, std::uint32_t count) {
    return std::all_of(tasks, tasks + count, [](const task &t) { return t.runs == 1; });
  }

  std::mutex mutex_;
};

TEST_F(BatchSchedulerConcurrency, RunsEveryRecordOnce) {
  batch_scheduler scheduler(mutex_, 4, &record_code);
  EXPECT_EQ(0, scheduler.running(batch_scheduler::shared_mode));  // no batch, no threads
  for (const std::uint32_t count : {0U, 1U, 2U, 5U, 100U, 1000U}) {
    const auto tasks = make_tasks(count);
    EXPECT_EQ(0, submit(scheduler, &run, tasks.get(), count));
    EXPECT_TRUE(each_ran_once(tasks.get(), count));
  }
  EXPECT_TRUE(codes.empty());
}

std::latch *first_has_begun = nullptr;
void meet(void *record, void *unused) {
  switch (static_cast<task *>(record)->slot) {
    case 0:  // by the only thread, which leaves the next to the caller
      first_has_begun->count_down();
      gate->wait();
      break;
    case 1:
      gate->count_down();
      break;
    default:
      first_has_begun->wait();
  }
  run(record, unused);
}

TEST_F(BatchSchedulerConcurrency, TheCallerRunsItsRecordAndHelps) {
  batch_scheduler scheduler(mutex_, 1, &record_code);
  std::latch opened(1), begun(1);
  gate = &opened;
  first_has_begun = &begun;
  const auto tasks = make_tasks(3, 3);
  EXPECT_EQ(0, scheduler.RunBatch(&meet, tasks.get(), 2, sizeof(task), batch_scheduler::shared_mode, &tasks[2]));
  EXPECT_TRUE(each_ran_once(tasks.get(), 3));
  EXPECT_NE(std::this_thread::get_id(), tasks[0].ran_on);
  EXPECT_EQ(std::this_thread::get_id(), tasks[1].ran_on);
  EXPECT_EQ(std::this_thread::get_id(), tasks[2].ran_on);
}

TEST_F(BatchSchedulerConcurrency, PinnedRecordsRunOnTheirThread) {
  constexpr std::uint32_t slots = 3, count = 200;  // more for a thread than its ring holds
  batch_scheduler scheduler(mutex_, slots, &record_code);
  std::vector<std::thread::id> threads(slots);
  for (int round = 0; round < 3; ++round) {
    const auto tasks = make_tasks(count, slots);
    ASSERT_EQ(0, submit(scheduler, &run, tasks.get(), count, batch_scheduler::pinned_mode));
    EXPECT_TRUE(each_ran_once(tasks.get(), count));
    for (std::uint32_t i = 0; i < count; ++i) {
      if (round == 0 && i < slots) threads[i] = tasks[i].ran_on;
      EXPECT_EQ(threads[i % slots], tasks[i].ran_on);
    }
  }
  EXPECT_NE(threads[0], threads[1]);
}

TEST_F(BatchSchedulerConcurrency, MoreBatchesThanRecords) {
  constexpr std::uint32_t batches = 33, count = 3;
  batch_scheduler scheduler(mutex_, 2, &record_code);
  std::latch opened(1);
  gate = &opened;
  std::vector<std::unique_ptr<task[]>> tasks(batches);
  std::vector<std::thread> callers;
  std::atomic<std::uint32_t> over{0};
  for (std::uint32_t i = 0; i < batches; ++i)
    callers.emplace_back([&, i] {
      tasks[i] = make_tasks(count);
      EXPECT_EQ(0, submit(scheduler, &wait_at_gate, tasks[i].get(), count));
      ++over;
    });
  EXPECT_EQ(0U, over);
  opened.count_down();
  for (std::thread &caller : callers) caller.join();
  for (const auto &batch : tasks) EXPECT_TRUE(each_ran_once(batch.get(), count));
  // Batches that are over are taken back however many there were.
  for (int i = 0; i < 100; ++i) {
    const auto one = make_tasks(1);
    ASSERT_EQ(0, submit(scheduler, &run, one.get(), 1));
  }
}

TEST_F(BatchSchedulerConcurrency, TimesOutAndRecovers) {
  for (const std::int32_t mode : {batch_scheduler::shared_mode, batch_scheduler::pinned_mode}) {
    codes.clear();
    batch_scheduler scheduler(mutex_, 1, &record_code, 50ms);
    std::latch opened(1);
    gate = &opened;
    const auto tasks = make_tasks(2);
    const std::int32_t code = mode == batch_scheduler::pinned_mode ? pinned_timeout : shared_timeout;
    EXPECT_EQ(code, submit(scheduler, &wait_at_gate, tasks.get(), 2, mode));
    EXPECT_EQ(std::vector{code}, codes);
    EXPECT_EQ(0, tasks[0].runs);
    opened.count_down();
    while (tasks[0].runs + tasks[1].runs < 2) std::this_thread::sleep_for(1ms);  // the tasks are not cancelled
    const auto after = make_tasks(3);
    EXPECT_EQ(0, submit(scheduler, &run, after.get(), 3, mode));
    EXPECT_TRUE(each_ran_once(after.get(), 3));
  }
}

TEST_F(BatchSchedulerConcurrency, ABatchThatFindsNoRecordTimesOut) {
  batch_scheduler scheduler(mutex_, 1, &record_code, 10ms);
  std::latch opened(1);
  gate = &opened;
  std::vector<std::unique_ptr<task[]>> tasks;
  for (std::size_t i = 0; i <= batch_scheduler::batch_count; ++i) {
    tasks.push_back(make_tasks(1));
    EXPECT_EQ(shared_timeout, submit(scheduler, &wait_at_gate, tasks.back().get(), 1));
  }
  opened.count_down();
  const auto after = make_tasks(1);
  while (submit(scheduler, &run, after.get(), 1) != 0) {
  }
  EXPECT_EQ(0, tasks.back()[0].runs);  // was never taken in
  EXPECT_TRUE(each_ran_once(tasks[31].get(), 1));
}

TEST_F(BatchSchedulerConcurrency, DeadThreadsAreReplaced) {
  if (*LUMRA_SANITIZE) GTEST_SKIP() << "sanitizers do not follow a thread that is ended from inside";
  for (const std::int32_t mode : {batch_scheduler::shared_mode, batch_scheduler::pinned_mode}) {
    batch_scheduler scheduler(mutex_, 2, &record_code, 250ms);
    const auto fatal = make_tasks(2, 2), after = make_tasks(20, 2);
    EXPECT_NE(0, submit(scheduler, &end_thread, fatal.get(), 2, mode));
    while (scheduler.running(mode) > 0) std::this_thread::sleep_for(1ms);
    EXPECT_EQ(0, submit(scheduler, &run, after.get(), 20, mode));
    EXPECT_TRUE(each_ran_once(after.get(), 20));
  }
}

TEST_F(BatchSchedulerConcurrency, StopsWithinASecondHoweverBusy) {
  auto scheduler = std::make_unique<batch_scheduler>(mutex_, 2, &record_code);
  const auto tasks = make_tasks(1), stuck = make_tasks(1);
  EXPECT_EQ(0, submit(*scheduler, &run, tasks.get(), 1));
  EXPECT_EQ(0, submit(*scheduler, &run, tasks.get(), 1, batch_scheduler::pinned_mode));
  scheduler->stop();
  EXPECT_EQ(0, scheduler->running(batch_scheduler::shared_mode));  // idle threads are woken, and leave at once

  scheduler = std::make_unique<batch_scheduler>(mutex_, 1, &record_code, 20ms);
  std::latch opened(1);
  gate = &opened;
  EXPECT_EQ(shared_timeout, submit(*scheduler, &wait_at_gate, stuck.get(), 1));
  const auto stop_begin = std::chrono::steady_clock::now();
  scheduler->stop();
  EXPECT_LT(std::chrono::steady_clock::now() - stop_begin, 2s);
  EXPECT_EQ(1, scheduler->running(batch_scheduler::shared_mode));
  opened.count_down();
  while (scheduler->running(batch_scheduler::shared_mode) > 0) std::this_thread::sleep_for(1ms);
  std::this_thread::sleep_for(20ms);  // the thread is out of the scheduler's reach before that goes
}

/// Threads that are made meanwhile find no room for their stacks.
class no_room_for_stacks {
 public:
  no_room_for_stacks() {
    pthread_getattr_default_np(&before_);
    pthread_attr_t attributes = before_;
    pthread_attr_setstacksize(&attributes, std::size_t{1} << 48);
    pthread_setattr_default_np(&attributes);
  }
  ~no_room_for_stacks() { pthread_setattr_default_np(&before_); }

 private:
  pthread_attr_t before_{};
};

TEST_F(BatchSchedulerConcurrency, ThreadsThatCannotBeStarted) {
  if (*LUMRA_SANITIZE) GTEST_SKIP() << "sanitizers choose stacks of their own";
  batch_scheduler scheduler(mutex_, 3, &record_code, 50ms);
  const auto tasks = make_tasks(2), after = make_tasks(5);
  {
    const no_room_for_stacks here;
    EXPECT_EQ(shared_timeout,
              scheduler.RunBatch(&run, tasks.get(), 1, sizeof(task), batch_scheduler::shared_mode, &tasks[1]));
    EXPECT_EQ(0, tasks[0].runs);  // not even by the caller
    EXPECT_EQ(pinned_timeout, submit(scheduler, &run, tasks.get(), 2, batch_scheduler::pinned_mode));
  }
  EXPECT_EQ((std::vector{shared_thread_failed, shared_thread_failed, shared_thread_failed, shared_timeout,
                         pinned_thread_failed, pinned_thread_failed, pinned_thread_failed, pinned_timeout}),
            codes);
  EXPECT_EQ(0, submit(scheduler, &run, after.get(), 5));
  EXPECT_TRUE(each_ran_once(after.get(), 5));
}

}  // namespace
