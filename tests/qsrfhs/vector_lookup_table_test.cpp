// SPDX-License-Identifier: MIT
#include <lumra/core_services.h>
#include <lumra/vector_utilities.h>

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <thread>
#include <vector>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "support/process.hpp"
#include "support/recorded.hpp"
#include "support/test_array.hpp"

namespace {

using tests::cf32_array;
using tests::f32_array;
using tests::in_child;

TEST(LookupTable, FollowsTheTable) {
  constexpr float nan = std::numeric_limits<float>::quiet_NaN();
  cf32_array table{{10, 1}, {2, 0},     {20, 2}, {4, -2},
                   {30, 3}, {100, 100}, {99, 99}};  // three entries and a stray value
  f32_array keys{5, 4.5F, 5.5F, 6.25F, 7, 100, 3.5F, nan};
  constexpr lumra_cf32 gains[] = {{10, 1}, {9, 1}, {11, 1}, {21, 1.5F}, {30, 3}, {30, 3}, {10, 1}, {10, 1}};
  cf32_array in(keys.elements().size()), out;
  for (lumra_cf32 &sample : in.elements()) sample = {0, 1};
  ASSERT_EQ(0, qsUtilHS_LookupTable(keys, in, in.address(), table, 5, 1));
  for (std::size_t i = 0; i < std::size(gains); ++i) {
    EXPECT_EQ(-gains[i].im, in.elements()[i].re) << i;
    EXPECT_EQ(gains[i].re, in.elements()[i].im) << i;
  }
  for (lumra_cf32 &sample : in.elements()) sample = {1, 0};
  ASSERT_EQ(0, qsUtilHS_LookupTable(keys, in, in.address(), table, 5, nan));
  for (const lumra_cf32 &sample : in.elements()) EXPECT_EQ(10, sample.re);
}

TEST(LookupTable, NothingToDo) {
  cf32_array in{{1, 2}}, out{{7, 7}}, half{{1, 0}}, table{{1, 0}, {0, 0}}, no_block;
  f32_array no_keys, one_key{0.F};
  EXPECT_EQ(0, qsUtilHS_LookupTable(no_keys, in, out.address(), table, 0, 1));
  EXPECT_EQ(0, out.block()->count);
  out.block()->count = 1;
  EXPECT_EQ(0, qsUtilHS_LookupTable(one_key, in, out.address(), half, 0, 1));
  EXPECT_EQ(0, out.elements()[0].re);
  for (const lumra_cf32_array missing : {no_block.handle(), lumra_cf32_array{}}) {
    out.block()->count = 1;
    EXPECT_EQ(0, qsUtilHS_LookupTable(one_key, missing, out.address(), table, 0, 1));
    EXPECT_EQ(0, out.block()->count);
  }
  EXPECT_EQ(0, qsUtilHS_LookupTable(nullptr, in, out.address(), table, 0, 1));
}

/// A call of n samples against one run of the kernel.
struct long_call {
  explicit long_call(std::size_t n) : keys(n), in(n), out(n), expected(2 * n) {
    for (std::size_t i = 0; i < n; ++i) {
      keys.elements()[i] = static_cast<float>(i % 1000) * 0.01F - 1;
      in.elements()[i] = {static_cast<float>(i % 77), static_cast<float>(i % 31) - 15};
    }
    qsrfhs::kernels::exact().lookup({&table.elements()[0].re, 4, 0.5F, 2}, keys.elements().data(), &in.elements()[0].re,
                                    expected.data(), n);
  }
  bool run() {
    std::memset(out.elements().data(), 0x55, out.elements().size_bytes());
    return qsUtilHS_LookupTable(keys, in, out.address(), table, 0.5F, 2) == 0 &&
           std::memcmp(out.elements().data(), expected.data(), out.elements().size_bytes()) == 0;
  }
  f32_array keys;
  cf32_array in, out, table{{1, 2}, {3, 4}, {5, 6}, {7, 8}, {9, -1}, {2, 2}, {0, 1}, {5, 5}};
  std::vector<float> expected;
};

TEST(LookupTableConcurrency, TasksShareLongInputs) {
  for (const std::size_t n : {65536U, 65537U, 98303U, 98304U, 131071U, 131072U, 200001U}) {
    long_call call(n);
    EXPECT_TRUE(call.run()) << n;
  }
}

TEST(LookupTableConcurrency, ManyCallersAtOnce) {
  std::vector<std::thread> callers;
  std::atomic<int> good{0};
  for (int i = 0; i < 40; ++i)
    callers.emplace_back([&good, i] {
      long_call call(65537 + static_cast<std::size_t>(i) * 1000);
      for (int round = 0; round < 3; ++round) good += call.run() ? 1 : 0;
    });
  for (std::thread &caller : callers) caller.join();
  EXPECT_EQ(120, good);
}

constexpr bool thread_sanitizer = std::string_view(LUMRA_SANITIZE).find("thread") != std::string_view::npos;

TEST(LookupTableFork, ChildrenFindWorkingTeams) {
  if (thread_sanitizer) GTEST_SKIP() << "no threads after a fork";
  long_call call(100000);
  ASSERT_TRUE(call.run());
  // They leave as a host does.
  const auto runs = [&] { return call.run(); };
  EXPECT_EQ(0, in_child([&] { return runs() && in_child(runs, &std::exit) == 0; }, &std::exit));
  EXPECT_TRUE(call.run());
}

TEST(LookupTableFork, ForksInTheMiddleOfCalls) {
  if (thread_sanitizer) GTEST_SKIP() << "no threads after a fork";
  std::atomic<bool> over{false};
  std::atomic<int> bad{0}, started{0};
  std::vector<std::thread> callers;
  // Not on the threads' stacks: the child has none of them, and what they alone hold would be leaked there.
  std::array<long_call, 3> calls{long_call(66000), long_call(66000), long_call(66000)};
  for (long_call &own : calls)
    callers.emplace_back([&] {
      bad += own.run() ? 0 : 1;
      ++started;
      while (!over) bad += own.run() ? 0 : 1;
    });
  long_call call(70000);
  // A thread that starts may hold locks of a sanitizer's, which nobody would free in the child.
  while (started < std::ssize(callers)) std::this_thread::yield();
  const tests::recorded list;
  for (int i = 0; i < 20; ++i)
    EXPECT_EQ(0, in_child([&] { return call.run() && qsUtilHS_NumCPUs() > 0 && list.codes().empty(); }, &std::exit));
  over = true;
  for (std::thread &caller : callers) caller.join();
  EXPECT_EQ(0, bad);
}

}  // namespace
