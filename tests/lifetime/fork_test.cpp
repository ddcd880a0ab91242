// Forks while other threads are inside the library: the child uses all of it. SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <thread>
#include <vector>

#include "lifetime/caller.hpp"
#include "support/process.hpp"

namespace {

using lifetime::caller;
using lifetime::shared_objects;
using tests::in_child;

/// Threads that are in the library as long as this lives.
template <class Work>
class busy_threads {
 public:
  busy_threads(int count, Work work) {
    for (int i = 0; i < count; ++i)
      threads_.emplace_back([this, work, i] {
        while (!over_) work(i);
      });
  }
  busy_threads(const busy_threads &) = delete;
  busy_threads &operator=(const busy_threads &) = delete;
  ~busy_threads() { over_ = true; }

 private:
  std::atomic<bool> over_{false};
  std::vector<std::jthread> threads_;
};

/// The sanitizers' own allocator has locks that no handler of a fork frees: children hang in it where threads of the
/// parent allocate.
class Fork : public testing::TestWithParam<int> {
 protected:
  void SetUp() override {
    if (*LUMRA_SANITIZE) GTEST_SKIP() << "sanitizers do not survive forks beside threads that allocate";
  }
};

TEST_P(Fork, InsideAFamily) {
  shared_objects shared;
  caller first(shared, 1), second(shared, 2), forking(shared, 3);
  const busy_threads busy(2, [&](int i) { (i == 0 ? first : second).call(GetParam()); });
  for (int i = 0; i < 30; ++i) {
    std::this_thread::sleep_for(std::chrono::microseconds(50 + 37 * (i % 20)));
    ASSERT_EQ(0, in_child([&] {
                bool good = false;
                std::thread([&] { good = caller(shared, 4).call_all(); }).join();
                return good && forking.call_all();
              }))
        << "fork " << i;
  }
  EXPECT_TRUE(forking.call_all());
}

INSTANTIATE_TEST_SUITE_P(Families, Fork, testing::Range(0, lifetime::family_count));

TEST_F(Fork, BesideThreadsThatComeAndGo) {
  shared_objects shared;
  caller forking(shared, 3);
  // A thread's first and last calls are where MKL opens and closes what it keeps for the thread.
  const busy_threads busy(2, [&](int i) { std::thread([&] { caller(shared, i).call(8); }).join(); });
  for (int i = 0; i < 30; ++i) ASSERT_EQ(0, in_child([&] { return forking.call_all(); })) << "fork " << i;
}

TEST_F(Fork, ByTwoThreadsAtOnceAndInChildren) {
  shared_objects shared;
  const auto fork_often = [&](int number) {
    for (int i = 0; i < 20; ++i)
      EXPECT_EQ(0, in_child([&] {
                  caller child(shared, number);
                  return child.call_all() && in_child([&] { return child.call_all(); }) == 0;
                }));
  };
  std::jthread other(fork_often, 5);
  fork_often(6);
}

TEST(QuietFork, WaitersStayInTheParent) {
  shared_objects shared;
  std::jthread reader([&] {
    char text[100];
    (void)qsLumraAlgo_ReadLog(shared.session, 0, text, sizeof text);
  });
  const busy_threads busy(2, [&](int i) {
    char data[2000] = "";
    (void)qsLTEHS_DataFIFO(shared.fifo, i, data, data, 0, i == 0 ? 1025 : 1);
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(20));
  for (int i = 0; i < 20; ++i)
    EXPECT_EQ(0, in_child([&] {
                char data[8] = "seven";
                const bool passes = qsLTEHS_DataFIFO_Flush(shared.fifo) == 0 &&
                                    qsLTEHS_DataFIFO(shared.fifo, 0, data, nullptr, 0, 8) == 8 &&
                                    qsLTEHS_DataFIFO(shared.fifo, 1, nullptr, data, 0, 8) == 8;
                const bool times_out = qsLTEHS_DataFIFO(shared.fifo, 1, nullptr, data, 0, 8) == -1;
                const bool all = caller(shared, 1).call_all();
                return passes && times_out && all && qsLTEHS_DataFIFOUnreserve(&shared.fifo_cell) == 0 &&
                       qsLumraAlgo_CloseSession(shared.session) == 0;
              }))
        << "fork " << i;
  qsLumraAlgo_CloseSession(shared.session);  // lets the reader go
}

shared_objects *seen_by_host = nullptr;
int child_of_host = -1;

std::int32_t fork_and_resize(std::int32_t type, std::int32_t dimensions, void *handle, std::uint64_t size) {
  child_of_host = in_child([] {
    (void)qsHost_SetArrayResize(nullptr);
    return caller(*seen_by_host, 7).call_all();
  });
  return qsHost_ArrayResize(type, dimensions, handle, size);
}

TEST(QuietFork, InsideAHostsResizeService) {
  shared_objects shared;
  seen_by_host = &shared;
  caller calling(shared, 1);
  const int none = 0;
  lumra_cf32_array out = nullptr, in = nullptr, scratch = nullptr;
  for (lumra_cf32_array *array : {&out, &in, &scratch}) (void)qsHost_ArrayNew(LUMRA_TYPE_CF32, 1, &none, array);
  (void)qsHost_ArrayResize(LUMRA_TYPE_CF32, 1, &in, 16);
  (*in)->count = 16;
  (void)qsHost_SetArrayResize(&fork_and_resize);
  EXPECT_EQ(0, qsRFPELTA_c1DFFTH(in, out, 16, 0, scratch, nullptr));
  (void)qsHost_SetArrayResize(nullptr);
  EXPECT_EQ(0, child_of_host);
  for (lumra_cf32_array *array : {&out, &in, &scratch}) (void)qsHost_ArrayFree(array);
}

TEST(Sessions, HaveNoThreadsOfTheirOwn) {
  shared_objects shared;
  std::vector<std::uint64_t> sessions(5000);
  const auto before = tests::thread_count();
  for (std::uint64_t &session : sessions) ASSERT_EQ(0, qsLumraAlgo_CreateSession(&session));
  EXPECT_EQ(before, tests::thread_count());
  EXPECT_EQ(0, in_child([&] { return caller(shared, 1).call_all(); }));
  for (const std::uint64_t session : sessions) EXPECT_EQ(0, qsLumraAlgo_CloseSession(session));
}

}  // namespace
