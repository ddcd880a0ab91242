// The faults themselves: an injection that does nothing would let every other fault test pass.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <mkl_dfti.h>

#include <new>

#include "support/memory_faults.hpp"
#include "support/mkl_faults.hpp"

namespace {

TEST(FaultInjection, TheChosenAllocationFails) {
  const long before = tests::memory_faults::live();
  int thrown_at = 0;
  {
    const tests::memory_faults::fail_at armed(2);
    try {
      for (thrown_at = 1; thrown_at < 4; ++thrown_at)
        ::operator delete(::operator new(1));  // a call that no compiler may leave out
    } catch (const std::bad_alloc &) {
    }
  }
  EXPECT_EQ(2, thrown_at);
  EXPECT_EQ(2, tests::memory_faults::calls());
  EXPECT_EQ(before, tests::memory_faults::live());
}

TEST(FaultInjection, TheChosenTransformCallFails) {
  for (int n = 0; n <= 4; ++n) {
    DFTI_DESCRIPTOR_HANDLE descriptor = nullptr;
    float data[8] = {1, 0, 0, 0, 0, 0, 0, 0};
    MKL_LONG made = 0, committed = 0, computed = 0, freed = 0;
    {
      const tests::mkl_faults::fail_at armed(n);
      made = DftiCreateDescriptor(&descriptor, DFTI_SINGLE, DFTI_COMPLEX, 1, static_cast<MKL_LONG>(4));
      if (made == 0) committed = DftiCommitDescriptor(descriptor);
      if (made == 0 && committed == 0) computed = DftiComputeForward(descriptor, data);
      if (made == 0) freed = DftiFreeDescriptor(&descriptor);
    }
    const MKL_LONG failure = DFTI_MEMORY_ERROR;
    EXPECT_EQ(n == 1 ? failure : 0, made);
    EXPECT_EQ(n == 2 ? failure : 0, committed);
    EXPECT_EQ(n == 3 ? failure : 0, computed);
    EXPECT_EQ(n == 4 ? failure : 0, freed);
    EXPECT_EQ(0, tests::mkl_faults::live_descriptors());
  }
}

}  // namespace
