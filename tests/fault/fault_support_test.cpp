// The faults themselves: an injection that does nothing, or counts nothing, would let other fault tests pass.
// SPDX-License-Identifier: MIT
#include <mkl_dfti.h>

#include <new>

#include "support/faults.hpp"

namespace {

using namespace tests;

TEST(FaultInjection, TheChosenAllocationFails) {
  long left = -1;
  const int calls = fail_each(
      allocations,
      [&] {
        const long before = allocations.live;
        void *first = nullptr, *second = nullptr;  // calls that no compiler may leave out
        first = ::operator new(1, std::nothrow);
        try {
          second = ::operator new[](1, std::align_val_t{64});
        } catch (const std::bad_alloc &) {
        }
        const long made = allocations.live - before;
        ::operator delete(first);
        ::operator delete[](second, std::align_val_t{64});
        left = allocations.live - before;
        return made;
      },
      [&](long made, bool failed) {
        EXPECT_EQ(failed ? 1 : 2, made);
        EXPECT_EQ(0, left);
      });
  EXPECT_EQ(2, calls);
}

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
