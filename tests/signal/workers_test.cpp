// SPDX-License-Identifier: MIT
#include "signal/workers.hpp"

#include <gtest/gtest.h>
#include <immintrin.h>

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

TEST(WorkersConcurrency, RoundAsTheirCaller) {
  if (std::thread::hardware_concurrency() < 2) GTEST_SKIP() << "no workers on one processor";
  constexpr unsigned control = 0x1f80, upwards = 0x4000, no_denormals = 0x8040;
  for (const unsigned wanted : {control | upwards, control | no_denormals, control}) {
    std::latch both(2);
    unsigned found[2]{};
    _mm_setcsr(wanted);
    dsp::run_parts(2, [&](std::size_t k) {
      both.arrive_and_wait();
      found[k] = _mm_getcsr();
    });
    EXPECT_EQ(wanted, found[0] & ~0x3fU);
    EXPECT_EQ(wanted, found[1] & ~0x3fU);
  }
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
