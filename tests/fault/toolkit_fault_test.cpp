// Toolkit operations whose every call of the host, of MKL and of the allocator fails in turn: outputs and scratch are
// empty afterwards, nothing leaks, and the same slot serves the next call. SPDX-License-Identifier: MIT
#include <set>

#include "support/memory_faults.hpp"
#include "support/mkl_faults.hpp"
#include "toolkit/operations.hpp"

namespace {

using namespace tests;

constexpr std::int32_t no_memory = -20001, not_computed = -359501, not_made = -359502, not_freed = -359503;

template <class E>
class ToolkitFaults : public testing::Test {
 protected:
  ToolkitFaults() { host.calls.reserve(10000); }  // the host's own records must not count as allocations
  fake_host host{fake_host::unit::elements};

  /// The call that failed left nothing; the next one gives what a first one gives.
  void expect_recovery(const operation<E> &op, arguments<E> &failed) {
    EXPECT_TRUE(op.result(failed).empty());
    EXPECT_TRUE(failed.scratch_is_empty());
    arguments<E> fresh, again;
    std::swap(failed.slot, again.slot);
    EXPECT_EQ(0, op.run(fresh));
    EXPECT_EQ(0, op.run(again));
    EXPECT_EQ(op.result(fresh), op.result(again));
    EXPECT_TRUE(again.scratch_is_empty());
  }
};
TYPED_TEST_SUITE(ToolkitFaults, all_letters);

TYPED_TEST(ToolkitFaults, EveryResizeFailsOnce) {
  using E = TypeParam;
  for (const auto &op : operations<E>()) {
    for (int n = 0;; ++n) {
      SCOPED_TRACE(testing::Message() << op.name << ", resize " << n);
      arguments<E> a;
      a.fill_slot();
      this->host.calls.clear();
      this->host.refuse_from = n;
      this->host.refuse_until = n + 1;
      const std::int32_t status = op.run(a);
      const bool reached = static_cast<int>(this->host.calls.size()) > n;
      this->host.refuse_from = -1;
      if (!reached) {
        EXPECT_EQ(0, status);
        EXPECT_GE(n, 2);
        break;
      }
      // Emptying is allowed to be refused: the counts become 0 nevertheless.
      EXPECT_TRUE(status == no_memory || status == 0) << status;
      EXPECT_TRUE(a.scratch_is_empty());
      if (status == no_memory) this->expect_recovery(op, a);
    }
  }
  EXPECT_EQ(0, mkl_faults::live_descriptors());
}

TYPED_TEST(ToolkitFaults, EveryResizeFailsFromOneOn) {
  using E = TypeParam;
  for (const auto &op : operations<E>()) {
    SCOPED_TRACE(op.name);
    arguments<E> a;
    this->host.calls.clear();
    this->host.refuse_from = 0;
    this->host.refuse_until = 1 << 30;
    EXPECT_EQ(no_memory, op.run(a));
    this->host.refuse_from = -1;
    this->expect_recovery(op, a);
  }
}

TYPED_TEST(ToolkitFaults, EveryTransformCallFailsOnce) {
  using E = TypeParam;
  std::set<std::int32_t> seen;
  for (const auto &op : operations<E>()) {
    for (int n = 1;; ++n) {
      SCOPED_TRACE(testing::Message() << op.name << ", call " << n);
      arguments<E> a;
      a.fill_slot();
      std::int32_t status = 0;
      {
        const mkl_faults::fail_at armed(n);
        status = op.run(a);
      }
      if (mkl_faults::calls() < n) {
        EXPECT_EQ(0, status);
        break;
      }
      EXPECT_TRUE(status == not_computed || status == not_made || status == not_freed) << status;
      EXPECT_EQ(nullptr, a.slot);
      EXPECT_EQ(0, mkl_faults::live_descriptors());
      seen.insert(status);
      this->expect_recovery(op, a);
    }
  }
  EXPECT_EQ((std::set{not_computed, not_made, not_freed}), seen);
  EXPECT_EQ(0, mkl_faults::live_descriptors());
}

TYPED_TEST(ToolkitFaults, EveryAllocationFailsOnce) {
  using E = TypeParam;
  for (const auto &op : operations<E>()) {
    for (int n = 1;; ++n) {
      SCOPED_TRACE(testing::Message() << op.name << ", allocation " << n);
      const long before = memory_faults::live();
      arguments<E> a;
      std::int32_t status = 0;
      this->host.calls.clear();
      {
        const memory_faults::fail_at armed(n);
        status = op.run(a);
      }
      const int reached = memory_faults::calls();
      if (reached < n) {
        EXPECT_EQ(0, status);
        break;
      }
      EXPECT_EQ(no_memory, status);
      EXPECT_EQ(nullptr, a.slot);
      EXPECT_EQ(0, mkl_faults::live_descriptors());
      EXPECT_EQ(before, memory_faults::live());
      this->expect_recovery(op, a);
    }
  }
}

TYPED_TEST(ToolkitFaults, ATransformThatFitsIsUsedAgain) {
  using E = TypeParam;
  for (const auto &op : operations<E>()) {
    SCOPED_TRACE(op.name);
    arguments<E> first, second;
    ASSERT_EQ(0, op.run(first));
    if (!first.slot) continue;
    std::swap(first.slot, second.slot);
    const void *transform = second.slot;
    const int made = mkl_faults::live_descriptors();
    {
      const mkl_faults::fail_at counted(0);
      ASSERT_EQ(0, op.run(second));
    }
    EXPECT_EQ(transform, second.slot);
    EXPECT_EQ(made, mkl_faults::live_descriptors());
    EXPECT_LE(mkl_faults::calls(), 4);  // the length, and three transforms at most
    EXPECT_EQ(op.result(first), op.result(second));
  }
}

TEST(TransformSlot, ReleaseTellsAFailureAndEmptiesTheSlot) {
  arguments<toolkit::s> a;
  fake_host host(fake_host::unit::elements);
  a.fill_slot();
  ASSERT_NE(nullptr, a.slot);
  {
    const mkl_faults::fail_at armed(1);
    EXPECT_EQ(not_freed, qsHost_ReleaseTransform(&a.slot));
  }
  EXPECT_EQ(nullptr, a.slot);
  EXPECT_EQ(0, mkl_faults::live_descriptors());
}

}  // namespace
