// Memory and transforms that fail in the core services, at every step. SPDX-License-Identifier: MIT
#include <lumra/array_store.h>
#include <lumra/data_fifo.h>
#include <lumra/fft_resampler.h>
#include <lumra/filter_registry.h>

#include <gtest/gtest.h>

#include <complex>
#include <set>
#include <vector>

#include "host/host_array.hpp"
#include "qsrfhs/math/filter_registry.hpp"
#include "qsrfhs/vector/fft_resampler.hpp"
#include "support/faults.hpp"
#include "support/recorded.hpp"

namespace {

using namespace tests;
using codes = std::vector<std::int32_t>;

/// Allocation by allocation; check sees the status, whether one failed, and what was recorded.
template <class Work, class Check>
int fail_each_allocation(Work work, Check check) {
  recorded list;
  return fail_each(
      allocations,
      [&] {
        list = recorded();
        return work();
      },
      [&](auto status, bool failed) { check(status, failed, list.codes()); });
}

TEST(ServicesFaults, AnArrayIsHadOrNot) {
  lumra_array_ref record{1, nullptr};
  lumra_array_ref *array = &record;
  constexpr std::int32_t no_block = -33620079, unregistered = -46;
  std::set<std::int32_t> seen;
  // No class of its own: the first try that gets as far as the block makes one, which is used again.
  fail_each_allocation([&] { return qsUtilHS_AllocateArray_CSG(&array, 1 << 20, 1); },
                       [&](std::int32_t status, bool, const codes &list) {
                         seen.insert(status);
                         if (status == 0) return;
                         EXPECT_EQ(nullptr, +record.block);
                         // The list of failures may be what there is no memory for.
                         EXPECT_TRUE(list.empty() || (status == no_block && list.front() == no_block));
                       });
  EXPECT_EQ((std::set{0, no_block, unregistered}), seen);
  const lumra_array_block *const block = record.block;
  EXPECT_EQ(0, qsUtilHS_FreeArray_CSG(&array));
  EXPECT_EQ(0, qsUtilHS_AllocateArray_CSG(&array, 1 << 20, 1));
  EXPECT_EQ(block, +record.block);  // the one block that was made: none got lost
  EXPECT_EQ(0, qsUtilHS_FreeArray_CSG(&array));
}

TEST(ServicesFaults, AFifoIsHadOrNot) {
  std::uint64_t *cell = nullptr;
  const auto attempt = [&] { return qsLTEHS_DataFIFOCreate("fault", 64, 0, &cell); };
  const auto run = [&] {
    std::uint64_t *const existing = (attempt(), cell);
    const std::uint64_t handle = *existing;
    cell = nullptr;
    const int steps = fail_each(allocations, attempt, [&](std::uint64_t made, bool failed) {
      EXPECT_EQ(!failed, made != 0);
      if (failed) {
        EXPECT_EQ(0, qsLTEHS_DataFIFO_GetStatus(handle, nullptr, nullptr));  // not replaced by nothing
        EXPECT_TRUE(!cell || *cell == 0);
      }
      qsLTEHS_DataFIFOUnreserve(&cell);
      cell = nullptr;
    });
    cell = existing;
    EXPECT_EQ(0, qsLTEHS_DataFIFOUnreserve(&cell));
    return steps;
  };
  EXPECT_GE(run(), 3);  // the cell, its entry, the object
  const long before = allocations.live;
  run();
  EXPECT_LE(allocations.live, before);  // FIFO objects wait for the next
  const int blocks = fail_each(zeroed, attempt, [&](std::uint64_t made, bool failed) {
    EXPECT_EQ(failed, made == 0);
    ASSERT_NE(nullptr, cell);
    EXPECT_EQ(made, *cell);
    EXPECT_EQ(0, qsLTEHS_DataFIFOUnreserve(&cell));
  });
  EXPECT_EQ(1, blocks);
}

TEST(ServicesFaults, AFilterIsRegisteredOrNot) {
  const lumra_filter_key key{2, {}, {4, 1, .25, 8}};
  lumra_filter_record record{};
  const long before = allocations.live;
  const int steps = fail_each(
      allocations, [&] { return qsUtilHS_RegisterFilterSpec(&record, nullptr, &key, 0); },
      [&](std::int32_t status, bool failed) {
        EXPECT_EQ(failed ? -50462898 : 0, status);
        EXPECT_EQ(failed, record.entry == nullptr);
        EXPECT_EQ(failed, qsrfhs::filter_registry::instance().total_cost() == 0);
      });
  EXPECT_GE(steps, 5);
  EXPECT_EQ(1U, record.identifier);  // failures use up none
  qsUtilHS_MatchFilterSpecErase(&record, &key, 1);
  EXPECT_EQ(0, qsUtilHS_UnegisterFilterSpec(&record));
  EXPECT_LE(allocations.live, before + 40);  // tables, and the list of failures
}

TEST(ServicesFaults, ADescriptorIsHadOrNot) {
  const long before = transforms.live;
  lumra_resampler_descriptor *out = nullptr;
  const auto create = [&] { return qsUtilHS_FFTResampler_CSG_CreateDescriptor(&out, 120, 1, 1, 77); };
  std::set<std::int32_t> seen;
  fail_each_allocation(create, [&](std::int32_t status, bool, const codes &list) {
    EXPECT_EQ(status == 0, out != nullptr);
    seen.insert(status);
    if ((status == -50397544 || status == -46) && list.size() > 1) {
      EXPECT_EQ((codes{status, -50397566}), list);
    }
  });
  EXPECT_EQ((std::set{0, -50397684, -50397544, -46}), seen);
  EXPECT_EQ(before + 1, transforms.live);
  // A descriptor that was lent before goes back where it came from.
  const lumra_resampler_descriptor *const known = out;
  qsUtilHS_FreeArrayIDH_CSG(77);
  fail_each(allocations, create, [&](std::int32_t status, bool) { EXPECT_TRUE(status != 0 || out == known); });
  EXPECT_EQ(known, out);
  qsUtilHS_FreeArrayIDH_CSG(77);
  // Lending it takes no memory that stays.
  const nothing_left after_any_number(allocations);
  for (int i = 0; i < 100; ++i) {
    create();
    qsUtilHS_FreeArrayIDH_CSG(77);
  }
}

TEST(ServicesFaults, TransformsThatCannotBeSetUpAreNamed) {
  const nothing_left in_the_end(transforms);
  const codes expected[] = {{-50397485, -50397506, -50397513}, {-50397485, -50397494, -50397499, -50397513}};
  for (const std::uint32_t inverse : {0U, 1U}) {
    lumra_resampler_descriptor *out = nullptr;
    for (std::size_t n = 0; n < expected[inverse].size(); ++n) {
      const nothing_left of_transforms(transforms);
      const recorded list;
      std::int32_t status = 0;
      {
        const fail_at armed(transforms, static_cast<int>(n) + 1);
        status = qsUtilHS_FFTResampler_CSG_CreateDescriptor(&out, 90, 1, inverse, 78);
      }
      EXPECT_EQ(expected[inverse][n], status);
      EXPECT_EQ(nullptr, out);
      EXPECT_EQ((codes{status, -50397566}), list.codes());
    }
  }
  // A transform of another length: query and free may fail, too.
  const std::int32_t again[] = {-50397466, -50397473, -50397485};
  for (int n = 1; n <= 3; ++n) {
    lumra_resampler_descriptor descriptor{};
    ASSERT_EQ(0, qsrfhs::prepare(descriptor, 32, false));
    const recorded list;
    {
      const fail_at armed(transforms, n);
      EXPECT_EQ(again[n - 1], qsrfhs::prepare(descriptor, 48, false));
    }
    EXPECT_EQ(nullptr, descriptor.transform);
    EXPECT_EQ(again[n - 1], list.codes().front());
  }
}

TEST(ServicesFaults, ABlockGoesOnWithoutItsTransforms) {
  lumra_resampler_descriptor *forward = nullptr, *inverse = nullptr;
  ASSERT_EQ(0, qsUtilHS_FFTResampler_CSG_CreateDescriptor(&forward, 32, 0, 0, 79));
  ASSERT_EQ(0, qsUtilHS_FFTResampler_CSG_CreateDescriptor(&inverse, 16, 1, 1, 79));
  const std::vector<std::complex<float>> x(32, 1.F);
  const std::vector<float> w(32, 1.F);
  std::vector<std::complex<float>> spectrum(32), out(16);
  // Query and transform, forward and then backward.
  const std::int32_t expected[4][2] = {{-50397466, -50397767}, {-50397767, 0}, {-50397466, -50397840}, {-50397840, 0}};
  for (int n = 1; n <= 4; ++n) {
    // A transform that could not even be asked for its length is gone: whole again first.
    ASSERT_EQ(0, qsrfhs::prepare(*forward, 32, false));
    ASSERT_EQ(0, qsrfhs::prepare(*inverse, 16, true));
    qsrfhs::resampler_channel channel{16, 16, w.data(), out, 0, 0, 0, 0};
    const recorded list;
    {
      const fail_at armed(transforms, n);
      qsrfhs::process_block({32, 16, 0}, *forward, *inverse, x.data(), spectrum.data(), 0, true, {&channel, 1});
    }
    const codes told = list.codes();
    ASSERT_FALSE(told.empty()) << n;
    EXPECT_EQ(expected[n - 1][0], told[0]) << n;
    if (expected[n - 1][1] != 0) {
      EXPECT_EQ(expected[n - 1][1], told.at(1)) << n;
    }
    EXPECT_EQ(16U, channel.produced);
  }
  qsUtilHS_FreeArrayIDH_CSG(79);
}

}  // namespace
