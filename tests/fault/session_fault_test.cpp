// Sessions while memory runs out and MKL fails, at every place where they can. SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <lumra/error_vector.h>
#include <lumra/session.h>

#include <algorithm>
#include <vector>

#include "c_support/base/session.hpp"
#include "support/memory_faults.hpp"
#include "support/mkl_faults.hpp"
#include "support/session.hpp"
#include "support/test_array.hpp"

namespace {

using tests::cf32_array;
using tests::f32_array;
using tests::open_session;

constexpr std::int32_t n = 64;

/// The calls of a measurement on one session, in the order in which a user makes them.
struct call {
  const char *name;
  std::int32_t (*run)(std::uint64_t session, const lumra_waveform &in, lumra_spectrum &out);
};
const call calls[] = {
    {"InitializeFFT", [](auto s, auto &, auto &) { return qsLumraAlgo_InitializeFFT(s, n); }},
    {"InitializeWindow", [](auto s, auto &, auto &) { return qsLumraAlgo_InitializeWindow(s, 1, n); }},
    {"unknown window", [](auto s, auto &, auto &) { return qsLumraAlgo_InitializeWindow(s, 9, n); }},
    {"prepared",
     [](auto s, auto &in, auto &out) { return qsLumraAlgo_PerformWindowingFFTAndIQTransform(s, 1, n, &in, &out); }},
    {"reset", [](auto s, auto &, auto &) { return qsLumraAlgo_ResetSession(s); }},
    {"unprepared",
     [](auto s, auto &in, auto &out) { return qsLumraAlgo_PerformWindowingFFTAndIQTransform(s, 1, n, &in, &out); }},
};

/// Runs every call with the k-th operation inside failing, for every k. A failure is an internal error and a log entry,
/// and the call succeeds when it is repeated.
template <class Fault, class Count>
void fail_everywhere(Count count, const char *first_message) {
  cf32_array input(4 * n);
  f32_array output(n);
  const lumra_waveform in{0, 1, input.handle()};
  const open_session session;
  int failures = 0;
  for (const call &c : calls) {
    SCOPED_TRACE(c.name);
    for (int k = 1;; ++k) {
      SCOPED_TRACE(k);
      lumra_spectrum out{-1, -1, output.handle()};
      std::int32_t code = 0;
      {
        const Fault fault(k);
        code = c.run(session, in, out);
      }
      if (count() < k) {
        EXPECT_EQ(0, code);
        break;
      }
      if (code == 0) continue;  // freed in vain, or memory for the log entry alone
      ++failures;
      EXPECT_EQ(-380122, code);
      EXPECT_EQ(-1, out.f0);
      const std::string entry = session.read_log();
      EXPECT_NE(std::string::npos, entry.find(first_message)) << entry;
    }
  }
  EXPECT_GT(failures, 5);
}

TEST(SessionFaults, MklFailsAtEveryCall) {
  fail_everywhere<tests::mkl_faults::fail_at>(&tests::mkl_faults::calls, DftiErrorMessage(DFTI_MEMORY_ERROR));
  EXPECT_EQ(0, tests::mkl_faults::live_descriptors());
}

TEST(SessionFaults, MklFailuresAreLoggedWithTheirPlace) {
  const open_session session;
  const int lines[] = {37, 38, 40, 31, 32};  // create, placement and commit; copy and commit of the clone
  for (int k = 1; k <= 5; ++k) {
    {
      const tests::mkl_faults::fail_at fault(k);
      EXPECT_EQ(-380122, qsLumraAlgo_InitializeFFT(session, n));
    }
    EXPECT_EQ(0U, session.read_log().find(R"(.\source\qsrfhs\math\fft:)" + std::to_string(lines[k - 1]) + " "));
  }
}

TEST(SessionFaults, MemoryRunsOutAtEveryAllocation) {
  const auto run = [] {
    fail_everywhere<tests::memory_faults::fail_at>(&tests::memory_faults::calls, "bad allocation");
  };
  run();  // what the test framework keeps once is there
  const long before = tests::memory_faults::live();
  run();
  EXPECT_EQ(before, tests::memory_faults::live());
}

TEST(SessionFaults, ASessionThatCannotBeMadeLeavesNothing) {
  const long before = tests::memory_faults::live();
  for (int k = 1;; ++k) {
    std::uint64_t session = 77;
    std::int32_t code = 0;
    {
      const tests::memory_faults::fail_at fault(k);
      code = qsLumraAlgo_CreateSession(&session);
    }
    if (code == 0) {
      EXPECT_LT(tests::memory_faults::calls(), k);
      qsLumraAlgo_CloseSession(session);
      break;
    }
    EXPECT_EQ(-380122, code);
    EXPECT_EQ(77U, session);
  }
  EXPECT_EQ(before, tests::memory_faults::live());
}

TEST(SessionFaults, ACallAllocatesItsTwoWorkBuffersOnly) {
  cf32_array input(4 * n);
  f32_array output(n);
  const lumra_waveform in{0, 1, input.handle()};
  lumra_spectrum out{0, 0, output.handle()};
  const open_session session;
  for (const call &c : std::span(calls).first(4)) ASSERT_EQ(0, c.run(session, in, out));
  {
    const tests::memory_faults::fail_at counting(0);
    EXPECT_EQ(0, calls[3].run(session, in, out));
  }
  EXPECT_EQ(2, tests::memory_faults::calls());
}

TEST(ErrorVectorFaults, WithoutMemoryTheOutputIsUntouched) {
  tests::test_array<lumra_cf32_matrix_block> a(2, 3), b(3, 2);
  tests::test_array<lumra_f32_matrix_block> e(1, 6);
  std::fill_n(e.block()->elements, 6, 7.F);
  for (const auto function :
       {&qsLumraAlgo_CalculateEVM2D, &qsLumraAlgo_CalculateMagnitudeError2D, &qsLumraAlgo_CalculatePhaseError2D}) {
    std::int32_t code = 0;
    {
      const tests::memory_faults::fail_at fault(1);
      code = function(a.handle(), b.handle(), e.handle(), LUMRA_ACCURACY_HIGH);
    }
    EXPECT_EQ(-312498, code);
    EXPECT_EQ(6, std::count(e.block()->elements, e.block()->elements + 6, 7.F));
  }
}

TEST(ArrayFaults, ARefusedAllocationLeavesTheArrayAsItWas) {
  const std::int32_t size = 4;
  lumra_f32_array first = nullptr;  // the allocator's own tables stay
  ASSERT_EQ(0, qsHost_ArrayNew(9, 1, &size, &first));
  qsHost_ArrayFree(&first);
  const long before = tests::memory_faults::live();
  for (int k = 1;; ++k) {
    lumra_f32_array array = nullptr;
    std::int32_t made = 0, grown = 0;
    {
      const tests::memory_faults::fail_at fault(k);
      made = qsHost_ArrayNew(9, 1, &size, &array);
      if (made == 0) grown = qsHost_ArrayResize(9, 1, &array, 1000);
    }
    EXPECT_TRUE(made == 0 || made == -20001);
    EXPECT_TRUE(grown == 0 || grown == -20001);
    EXPECT_EQ(made != 0, array == nullptr);
    if (array) {
      EXPECT_EQ(4, (*array)->count);
    }
    qsHost_ArrayFree(&array);
    if (made == 0 && grown == 0) break;
  }
  EXPECT_EQ(before, tests::memory_faults::live());
}

}  // namespace
