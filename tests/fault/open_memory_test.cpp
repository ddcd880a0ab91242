// Every allocation of every step of the open interface fails, alone and with all that follow: a code, nothing lost, and
// the same step done again gives what it always gives. SPDX-License-Identifier: MIT
#include "fault/open_lives.hpp"
#include "support/failing_malloc.h"

namespace {

using namespace tests;

TEST(OpenMemory, RunsOut) {
  int points = 0;
  for (const named_life &life : open_lives) {
    const auto plainly = [](auto step) { return step(); };
    const std::vector<float> expected = live_with(life, 0, plainly);
    for (std::size_t chosen = 0; chosen < life.steps.size(); ++chosen)
      for (const long count : {1L, 0L})
        for (long first = 1, tried = first; tried >= first; ++first, ++points) {
          long left = 0;
          for (int attempt = 0; attempt < 2; ++attempt) {  // what is lost is lost again, unlike what MKL keeps
            const long before = failing_malloc_live();
            {
              const auto result = live_with(life, chosen, [&](auto step) {
                failing_malloc_arm(first, count);
                const lumra_status code = step();
                tried = failing_malloc_disarm();
                EXPECT_TRUE(code == LUMRA_SUCCESS || (code == LUMRA_NO_MEMORY && tried >= first))
                    << life.name << ", step " << chosen << ", allocation " << first << ": " << code;
                return code;
              });
              EXPECT_EQ(expected, result) << life.name << ", step " << chosen << ", allocation " << first;
            }
            left = failing_malloc_live() - before;
            if (left <= 0) break;
          }
          EXPECT_LE(left, 0) << life.name << ", step " << chosen << ", allocation " << first;
        }
  }
  EXPECT_GT(points, 100);
}

}  // namespace
