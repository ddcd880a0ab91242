// Toolkit operations whose every call of the host and of MKL fails in turn: outputs, states and
// scratch are as a failure leaves them, nothing leaks, and the same slot serves the next call.
// SPDX-License-Identifier: MIT
#include <set>

#include "support/faults.hpp"
#include "toolkit/operations.hpp"

namespace {

using namespace tests;

constexpr std::int32_t success = 0, no_memory = -20001, refused_argument = -20061, no_convergence = -20068,
                       not_computed = -359501, not_made = -359502, not_freed = -359503;
using codes = std::set<std::int32_t>;

template <class E>
class ToolkitFaults : public testing::Test {
 protected:
  fake_host host{fake_host::unit::elements};

  /// The call that failed left nothing; the next one gives what a first one gives.
  void expect_recovery(const operation<E> &op, arguments<E> &failed) {
    EXPECT_TRUE(op.result(failed).empty());
    EXPECT_TRUE(failed.scratch_is_empty());
    arguments<E> again;
    std::swap(failed.slot, again.slot);
    expect_success(op, again);
  }
  void expect_success(const operation<E> &op, arguments<E> &a) {
    arguments<E> fresh;
    EXPECT_EQ(success, op.run(fresh));
    EXPECT_EQ(success, op.run(a));
    EXPECT_EQ(op.result(fresh), op.result(a));
    EXPECT_TRUE(a.scratch_is_empty());
  }

  /// Every call of the kind in every operation fails, one by one. The statuses that came of it.
  codes fail(fault_counter &kind, int status = 0) {
    const nothing_left of_transforms(transforms);
    codes seen;
    for (const auto &op : operations<E>()) {
      for (int n = 1;; ++n) {
        SCOPED_TRACE(testing::Message() << op.name << ", call " << n);
        arguments<E> a;
        a.fill_slot();
        host.calls.clear();
        std::int32_t code = 0;
        {
          const fail_at armed(kind, n, status);
          code = op.run(a);
        }
        if (kind.calls() < n) {
          EXPECT_EQ(success, code);
          break;
        }
        if (&kind == &transforms) {
          EXPECT_EQ(nullptr, a.slot);
        }
        seen.insert(code);
        EXPECT_TRUE(a.scratch_is_empty());
        if (code != success) expect_recovery(op, a);
      }
    }
    return seen;
  }
};
TYPED_TEST_SUITE(ToolkitFaults, all_letters);

TYPED_TEST(ToolkitFaults, EveryResizeFails) {
  // Emptying is allowed to be refused: the counts become 0 nevertheless.
  EXPECT_EQ((codes{success, no_memory}), this->fail(this->host.resizes));
}

TYPED_TEST(ToolkitFaults, EveryTransformCallFails) {
  EXPECT_EQ((codes{not_computed, not_made, not_freed}), this->fail(transforms));
}

TYPED_TEST(ToolkitFaults, EveryCallOfLapackFails) {
  const bool there = !toolkit::is_double<TypeParam>;
  EXPECT_EQ(there ? codes{refused_argument} : codes{}, this->fail(lapack, -4));
  EXPECT_EQ(there ? codes{no_convergence} : codes{}, this->fail(lapack, 3));
}

TYPED_TEST(ToolkitFaults, AllResizesFail) {
  using E = TypeParam;
  for (const auto &op : operations<E>()) {
    SCOPED_TRACE(op.name);
    arguments<E> a;
    this->host.refuse_from = static_cast<int>(this->host.calls.size());
    EXPECT_EQ(no_memory, op.run(a));
    this->host.refuse_from = -1;
    this->expect_recovery(op, a);
  }
}

TYPED_TEST(ToolkitFaults, ATransformThatFitsIsUsedAgain) {
  using E = TypeParam;
  for (const auto &op : operations<E>()) {
    SCOPED_TRACE(op.name);
    arguments<E> first, second;
    ASSERT_EQ(success, op.run(first));
    if (!first.slot) continue;
    std::swap(first.slot, second.slot);
    const void *transform = second.slot;
    {
      const nothing_left made(transforms);
      const fail_at counted(transforms, 0);
      ASSERT_EQ(success, op.run(second));
    }
    EXPECT_EQ(transform, second.slot);
    EXPECT_LE(transforms.calls(), 4);  // the length, and three transforms at most
    EXPECT_EQ(op.result(first), op.result(second));
  }
}

TEST(TransformSlot, ReleaseTellsAFailureAndEmptiesTheSlot) {
  const nothing_left of_transforms(transforms);
  fake_host host(fake_host::unit::elements);
  arguments<toolkit::s> a;
  a.fill_slot();
  ASSERT_NE(nullptr, a.slot);
  {
    const fail_at armed(transforms, 1);
    EXPECT_EQ(not_freed, qsHost_ReleaseTransform(&a.slot));
  }
  EXPECT_EQ(nullptr, a.slot);
}

}  // namespace
