// Sessions while MKL fails, at every place where it can. SPDX-License-Identifier: MIT
#include <lumra/session.h>

#include <mkl_dfti.h>

#include "fault/session_calls.hpp"
#include "support/faults.hpp"
#include "support/session.hpp"
#include "support/test_array.hpp"

namespace {

using namespace tests;

constexpr std::int32_t n = 64;

/// Each operation inside each call fails in turn. A failure is an internal error and a log entry, and the call succeeds
/// when it is repeated.
TEST(SessionFaults, MklFailsAtEveryCall) {
  const nothing_left of_transforms(transforms);
  cf32_array input(4 * n);
  f32_array output(n);
  const lumra_waveform in{0, 1, input.handle()};
  lumra_spectrum out{};
  const open_session session;
  int failures = 0;
  for (const session_call &c : session_calls) {
    SCOPED_TRACE(c.name);
    fail_each(
        transforms,
        [&] {
          out = {-1, -1, output.handle()};
          return c.run(session, n, in, out);
        },
        [&](std::int32_t code, bool failed) {
          EXPECT_TRUE(failed || code == 0);
          if (code == 0) return;  // also freed in vain
          ++failures;
          EXPECT_EQ(-380122, code);
          EXPECT_EQ(-1, out.f0);
          const std::string entry = session.read_log();
          EXPECT_NE(std::string::npos, entry.find(DftiErrorMessage(DFTI_MEMORY_ERROR))) << entry;
        });
  }
  EXPECT_GT(failures, 5);
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

}  // namespace
