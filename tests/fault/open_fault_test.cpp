// Every call of the open interface to MKL fails in turn. SPDX-License-Identifier: MIT
#include "fault/open_lives.hpp"
#include "support/faults.hpp"

namespace {

using namespace tests;

/// Every call of that kind in the steps from `first_step` on gives the code, or does without, and then the same step
/// gives what it always gives.
void fail_all(fault_counter &kind, int status, std::size_t first_step, lumra_status wanted) {
  int failures = 0;
  for (const named_life &life : open_lives) {
    const std::vector<float> expected = live_with(life, 0, [](auto step) { return step(); });
    const long before = transforms.live;  // those that are kept for whoever is next
    for (std::size_t chosen = first_step; chosen < life.steps.size(); ++chosen)
      for (int n = 1, calls = n; calls >= n; ++n) {
        const auto result = live_with(life, chosen, [&](auto step) {
          const auto code = [&] {
            const fail_at armed(kind, n, status);
            return step();
          }();
          calls = kind.calls();
          failures += code == wanted;
          EXPECT_TRUE(code == wanted || code == LUMRA_SUCCESS) << life.name << ": " << lumra_last_error();
          return code;
        });
        EXPECT_EQ(expected, result) << life.name << ", step " << chosen << ", call " << n;
      }
    EXPECT_LE(transforms.live, before) << life.name;
  }
  EXPECT_GT(failures, 0);
}

TEST(OpenFaults, EveryTransformCallFails) {
  fail_all(transforms, 0, 0, LUMRA_NO_MEMORY);
}

TEST(OpenFaults, EveryCallOfLapackFails) {
  fail_all(lapack, 3, 1, LUMRA_NO_CONVERGENCE);
}

}  // namespace
