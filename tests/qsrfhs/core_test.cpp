// Transform pool, worker pool. SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <latch>
#include <memory>
#include <string_view>
#include <thread>
#include <vector>

#include "platform/process.hpp"
#include "qsrfhs/math/exceptions.hpp"
#include "qsrfhs/math/fft.hpp"
#include "qsrfhs/util/thread_pool.hpp"
#include "support/process.hpp"

namespace {

TEST(FftPool, KeepsWhatItHasASlotFor) {
  qsrfhs::fft_pool pool;
  { const auto lease = pool.acquire(32); }
  EXPECT_EQ(0, pool.idle_count());  // no slot was reserved
  pool.prefill(64);
  pool.prefill(64);
  EXPECT_EQ(1, pool.idle_count());
  {
    const auto pooled = pool.acquire(64);
    EXPECT_EQ(0, pool.idle_count());
    pool.prefill(64);  // the slot that is lent out counts
    EXPECT_EQ(0, pool.idle_count());
    const auto fresh = pool.acquire(64);
  }
  EXPECT_EQ(1, pool.idle_count());

  pool.set_reserve_slots(1);
  { const auto lease = pool.acquire(32); }
  EXPECT_EQ(2, pool.idle_count());
  {
    const auto first = pool.acquire(64), second = pool.acquire(64);
    EXPECT_EQ(1, pool.idle_count());
  }
  EXPECT_EQ(3, pool.idle_count());
  {
    const auto lent = pool.acquire(64);
    pool.clear();
    EXPECT_EQ(0, pool.idle_count());
  }
  EXPECT_EQ(0, pool.idle_count());
  EXPECT_THROW((void)pool.acquire(qsrfhs::max_fft_length + 1), qsrfhs::invalid_argument);
}

TEST(ThreadPoolConcurrency, RunsWhatIsQueuedBeforeItEnds) {
  std::atomic<int> runs{0};
  {
    ctpl::thread_pool pool(8);
    for (int i = 0; i < 1000; ++i) (void)pool.push([&](std::int32_t) { ++runs; });
    EXPECT_EQ(42, pool.push([](std::int32_t) { return 42; }).get());
    auto failing = pool.push([](std::int32_t) { throw std::runtime_error("task"); });
    EXPECT_THROW(failing.get(), std::runtime_error);
    EXPECT_THROW(pool.push([&](std::int32_t) { pool.stop(); }).get(), std::system_error);
  }
  EXPECT_EQ(1000, runs);
}

TEST(ThreadPoolConcurrency, DroppedWorkersFinishTheirTaskAndTheRestServeTheQueue) {
  std::latch release(1), running(8);
  std::vector<std::future<std::int32_t>> held, later;
  {
    ctpl::thread_pool pool(8);
    for (int i = 0; i < 8; ++i)
      held.push_back(pool.push([&](std::int32_t worker) {
        running.count_down();
        release.wait();
        return worker;
      }));
    running.wait();
    for (int i = 0; i < 100; ++i) later.push_back(pool.push([](std::int32_t worker) { return worker; }));
    pool.resize(2);
    EXPECT_EQ(2, pool.size());
    release.count_down();
    for (auto &f : later) EXPECT_LT(f.get(), 2);
    for (auto &f : held) EXPECT_GE(f.get(), 0);
    pool.resize(3);
    EXPECT_EQ(3, pool.size());
  }
}

TEST(ThreadPool, HasNoThreadsBeforeItsFirstTask) {
  const auto before = tests::thread_count();
  ctpl::thread_pool pool(8);
  EXPECT_EQ(8, pool.size());
  EXPECT_GE(before, tests::thread_count());  // fewer where another test's have just left
  EXPECT_EQ(7, pool.push([](std::int32_t) { return 7; }).get());
}

TEST(ThreadPoolFork, WorkersStartAnewInTheChild) {
  if (std::string_view(LUMRA_SANITIZE).find("thread") != std::string_view::npos)
    GTEST_SKIP() << "no threads after a fork";
  std::latch release(1), running(1);
  ctpl::thread_pool pool(1);
  auto held = pool.push([&](std::int32_t) {
    running.count_down();
    release.wait();
  });
  running.wait();
  auto queued = pool.push([](std::int32_t) { return 1; });
  pool.before_fork();
  EXPECT_EQ(0, tests::in_child([&] {
              pool.after_fork_in_child();
              return pool.push([](std::int32_t) { return 2; }).get() == 2 && queued.get() == 1;
            }));
  pool.after_fork_in_parent();
  release.count_down();
  EXPECT_EQ(1, queued.get());
}

TEST(Process, KnowsWhatIsReadable) {
  const std::vector<char> block(100000);
  EXPECT_TRUE(platform::is_readable(block.data(), block.size()));
  EXPECT_FALSE(platform::is_readable(block.data(), std::size_t{1} << 35));
  EXPECT_FALSE(platform::is_readable(nullptr, 1));
  EXPECT_FALSE(platform::is_readable(block.data(), SIZE_MAX));
  EXPECT_EQ(nullptr, platform::find_symbol("no_such_symbol_anywhere"));
}

}  // namespace
