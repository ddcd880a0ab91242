// SPDX-License-Identifier: MIT
#include "signal/workers.hpp"

#include <gtest/gtest.h>

#include <atomic>
#include <latch>
#include <stdexcept>
#include <thread>
#include <vector>

namespace {

TEST(WorkersConcurrency, RunEachPartOnce) {
  constexpr std::size_t most = 9;
  std::vector<std::jthread> callers;
  for (std::size_t caller = 0; caller < 4; ++caller)
    callers.emplace_back([] {
      for (std::size_t round = 0; round < 300; ++round) {
        int runs[most]{};
        dsp::run_parts(round % (most + 1), [&](std::size_t k) { ++runs[k]; });
        for (std::size_t k = 0; k < most; ++k) ASSERT_EQ(k < round % (most + 1) ? 1 : 0, runs[k]);
      }
    });
}

TEST(WorkersConcurrency, TakePart) {
  if (std::thread::hardware_concurrency() < 2) GTEST_SKIP() << "no workers on one processor";
  std::latch both(2);
  dsp::run_parts(2, [&](std::size_t) { both.arrive_and_wait(); });
}

TEST(WorkersConcurrency, ThrowWhatTheFirstFailureThrew) {
  std::atomic<int> runs{0};
  try {
    dsp::run_parts(8, [&](std::size_t k) {
      ++runs;
      if (k % 3 == 2) throw std::out_of_range(std::to_string(k));
    });
    FAIL();
  } catch (const std::out_of_range &failure) {
    EXPECT_STREQ("2", failure.what());
  }
  EXPECT_EQ(8, runs);
}

}  // namespace
