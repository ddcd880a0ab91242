// Sessions while memory runs out and MKL fails, at every place where they can. SPDX-License-Identifier: MIT
#include <lumra/error_vector.h>
#include <lumra/session.h>

#include <algorithm>
#include <vector>

#include "c_support/base/session.hpp"
#include "support/faults.hpp"
#include "support/session.hpp"
#include "support/test_array.hpp"

namespace {

using namespace tests;

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

/// Each operation inside each call fails in turn. A failure is an internal error and a log entry, and the call succeeds
/// when it is repeated.
void fail_everywhere(fault_counter &kind, const char *first_message) {
  cf32_array input(4 * n);
  f32_array output(n);
  const lumra_waveform in{0, 1, input.handle()};
  lumra_spectrum out{};
  const open_session session;
  int failures = 0;
  for (const call &c : calls) {
    SCOPED_TRACE(c.name);
    fail_each(
        kind,
        [&] {
          out = {-1, -1, output.handle()};
          return c.run(session, in, out);
        },
        [&](std::int32_t code, bool failed) {
          EXPECT_TRUE(failed || code == 0);
          if (code == 0) return;  // also freed in vain, or without memory for the log entry alone
          ++failures;
          EXPECT_EQ(-380122, code);
          EXPECT_EQ(-1, out.f0);
          const std::string entry = session.read_log();
          EXPECT_NE(std::string::npos, entry.find(first_message)) << entry;
        });
  }
  EXPECT_GT(failures, 5);
}

TEST(SessionFaults, MklFailsAtEveryCall) {
  const nothing_left of_transforms(transforms);
  fail_everywhere(transforms, DftiErrorMessage(DFTI_MEMORY_ERROR));
}

TEST(SessionFaults, MklFailuresAreLoggedWithTheirPlace) {
  const open_session session;
  const int lines[] = {37, 38, 40, 31, 32};  // create, placement and commit; copy and commit of the clone
  for (int k = 1; k <= 5; ++k) {
    {
      const fail_at fault(transforms, k);
      EXPECT_EQ(-380122, qsLumraAlgo_InitializeFFT(session, n));
    }
    EXPECT_EQ(0U, session.read_log().find(R"(.\source\qsrfhs\math\fft:)" + std::to_string(lines[k - 1]) + " "));
  }
}

TEST(SessionFaults, MemoryRunsOutAtEveryAllocation) {
  fail_everywhere(allocations, "bad allocation");  // what the test framework keeps once is there
  const nothing_left of_memory(allocations);
  fail_everywhere(allocations, "bad allocation");
}

TEST(SessionFaults, ASessionThatCannotBeMadeLeavesNothing) {
  const nothing_left of_memory(allocations);
  std::uint64_t session = 0;
  fail_each(
      allocations,
      [&] {
        session = 77;
        return qsLumraAlgo_CreateSession(&session);
      },
      [&](std::int32_t code, bool failed) {
        EXPECT_EQ(failed ? -380122 : 0, code);
        EXPECT_EQ(failed, session == 77);
        if (!failed) qsLumraAlgo_CloseSession(session);
      });
}

TEST(SessionFaults, ACallAllocatesItsTwoWorkBuffersOnly) {
  cf32_array input(4 * n);
  f32_array output(n);
  const lumra_waveform in{0, 1, input.handle()};
  lumra_spectrum out{0, 0, output.handle()};
  const open_session session;
  for (const call &c : std::span(calls).first(4)) ASSERT_EQ(0, c.run(session, in, out));
  {
    const fail_at counting(allocations, 0);
    EXPECT_EQ(0, calls[3].run(session, in, out));
  }
  EXPECT_EQ(2, allocations.calls());
}

TEST(ErrorVectorFaults, WithoutMemoryTheOutputIsUntouched) {
  test_array<lumra_cf32_matrix_block> a(2, 3), b(3, 2);
  test_array<lumra_f32_matrix_block> e(1, 6);
  std::fill_n(e.block()->elements, 6, 7.F);
  for (const auto function :
       {&qsLumraAlgo_CalculateEVM2D, &qsLumraAlgo_CalculateMagnitudeError2D, &qsLumraAlgo_CalculatePhaseError2D}) {
    std::int32_t code = 0;
    {
      const fail_at fault(allocations, 1);
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
  const nothing_left of_memory(allocations);
  lumra_f32_array array = nullptr;
  std::int32_t made = 0, grown = 0;
  fail_each(
      allocations,
      [&] {
        array = nullptr;
        made = qsHost_ArrayNew(9, 1, &size, &array);
        grown = made == 0 ? qsHost_ArrayResize(9, 1, &array, 1000) : 0;
        return std::min(made, grown);
      },
      [&](std::int32_t code, bool failed) {
        EXPECT_EQ(failed ? -20001 : 0, code);
        EXPECT_EQ(made != 0, array == nullptr);
        EXPECT_TRUE(!array || (*array)->count == 4);
        qsHost_ArrayFree(&array);
      });
}

}  // namespace
