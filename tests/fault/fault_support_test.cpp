// The faults themselves: an injection that does nothing, or counts nothing, would let other fault tests pass.
// SPDX-License-Identifier: MIT
#include <mkl_dfti.h>

#include "support/faults.hpp"

namespace {

using namespace tests;

TEST(FaultInjection, TheChosenTransformCallFails) {
  const long before = transforms.live;
  const int calls = fail_each(
      transforms,
      [&] {
        DFTI_DESCRIPTOR_HANDLE descriptor = nullptr;
        float data[8] = {1, 0, 0, 0, 0, 0, 0, 0};
        if (DftiCreateDescriptor(&descriptor, DFTI_SINGLE, DFTI_COMPLEX, 1, static_cast<MKL_LONG>(4)) != 0) return true;
        EXPECT_EQ(before + 1, transforms.live);
        const bool failed = DftiCommitDescriptor(descriptor) != 0 || DftiComputeForward(descriptor, data) != 0;
        return DftiFreeDescriptor(&descriptor) != 0 || failed;
      },
      [&](bool returned, bool failed) {
        EXPECT_EQ(failed, returned);
        EXPECT_EQ(before, transforms.live);
      });
  EXPECT_EQ(4, calls);
}

}  // namespace
