// Memory and transforms that fail in the core services, at every step. SPDX-License-Identifier: MIT
#include <lumra/array_store.h>
#include <lumra/data_fifo.h>
#include <lumra/fft_resampler.h>
#include <lumra/filter_registry.h>

#include <gtest/gtest.h>

#include <atomic>
#include <complex>
#include <cstdlib>
#include <vector>

#include "host/host_array.hpp"
#include "qsrfhs/math/filter_registry.hpp"
#include "qsrfhs/vector/fft_resampler.hpp"
#include "support/memory_faults.hpp"
#include "support/mkl_faults.hpp"
#include "support/recorded.hpp"

namespace {
std::atomic<bool> refuse_zeroed{false};
}

extern "C" void *__real_calloc(std::size_t, std::size_t);
extern "C" void *__wrap_calloc(std::size_t n, std::size_t size) {
  return refuse_zeroed ? nullptr : __real_calloc(n, size);
}

namespace {

using tests::memory_faults::fail_at;

// Calls work with the n-th allocation failing, for every n until none does; gives its status and what it recorded.
template <class Work, class Check>
int for_every_allocation(Work work, Check check) {
  for (int n = 1;; ++n) {
    const tests::recorded list;
    std::int64_t status = 0;
    bool failed = false;
    {
      const fail_at armed(n);
      status = work();
      failed = tests::memory_faults::calls() >= n;
    }
    check(status, failed, list.codes());
    if (!failed) return n - 1;
  }
}

TEST(ServicesFaults, AnArrayIsHadOrNot) {
  lumra_array_ref record{1, nullptr};
  lumra_array_ref *array = &record;
  // No class of its own: the first try that gets as far as the block makes one, which is used again.
  bool seen_no_block = false, seen_unregistered = false;
  for_every_allocation([&] { return qsUtilHS_AllocateArray_CSG(&array, 1 << 20, 1); },
                       [&](std::int64_t status, bool, const std::vector<std::int32_t> &codes) {
                         if (status == 0) return;
                         EXPECT_EQ(nullptr, +record.block);
                         seen_no_block |= status == -33620079;
                         seen_unregistered |= status == -46;
                         if (status == -33620079 && !codes.empty()) {
                           EXPECT_EQ(-33620079, codes.front());
                         }
                         if (status == -46) {
                           EXPECT_TRUE(codes.empty());
                         }
                       });
  EXPECT_TRUE(seen_no_block);
  EXPECT_TRUE(seen_unregistered);
  const lumra_array_block *const block = record.block;
  EXPECT_EQ(0, qsUtilHS_FreeArray_CSG(&array));
  EXPECT_EQ(0, qsUtilHS_AllocateArray_CSG(&array, 1 << 20, 1));
  EXPECT_EQ(block, +record.block);  // the one block that was made: none got lost
  EXPECT_EQ(0, qsUtilHS_FreeArray_CSG(&array));
}

TEST(ServicesFaults, AFifoIsHadOrNot) {
  const auto attempt = [](std::uint64_t *&cell) { return qsLTEHS_DataFIFOCreate("fault", 64, 0, &cell); };
  const auto run = [&] {
    std::uint64_t *existing = nullptr;
    const std::uint64_t handle = attempt(existing);
    const int steps = for_every_allocation(
        [&] {
          std::uint64_t *cell = nullptr;
          const std::uint64_t made = attempt(cell);
          const auto status = static_cast<std::int64_t>(made);
          if (made == 0) {
            EXPECT_EQ(0, qsLTEHS_DataFIFO_GetStatus(handle, nullptr, nullptr));  // not replaced by nothing
            EXPECT_TRUE(!cell || *cell == 0);
          }
          qsLTEHS_DataFIFOUnreserve(&cell);
          return status;
        },
        [&](std::int64_t made, bool failed, const std::vector<std::int32_t> &) { EXPECT_EQ(!failed, made != 0); });
    EXPECT_EQ(0, qsLTEHS_DataFIFOUnreserve(&existing));
    return steps;
  };
  EXPECT_GE(run(), 3);  // the cell, its entry, the object
  const long before = tests::memory_faults::live();
  run();
  EXPECT_LE(tests::memory_faults::live(), before);  // FIFO objects wait for the next
  std::uint64_t *cell = nullptr;
  refuse_zeroed = true;
  const std::uint64_t none = attempt(cell);
  refuse_zeroed = false;
  EXPECT_EQ(0U, none);
  ASSERT_NE(nullptr, cell);
  EXPECT_EQ(0U, *cell);
  EXPECT_EQ(0, qsLTEHS_DataFIFOUnreserve(&cell));
}

TEST(ServicesFaults, AFilterIsRegisteredOrNot) {
  const lumra_filter_key key{2, {}, {4, 1, .25, 8}};
  lumra_filter_record record{};
  const long before = tests::memory_faults::live();
  const int steps = for_every_allocation([&] { return qsUtilHS_RegisterFilterSpec(&record, nullptr, &key, 0); },
                                         [&](std::int64_t status, bool failed, const std::vector<std::int32_t> &) {
                                           EXPECT_EQ(failed ? -50462898 : 0, status);
                                           if (!failed) return;
                                           EXPECT_EQ(nullptr, record.entry);
                                           EXPECT_EQ(0U, qsrfhs::filter_registry::instance().total_cost());
                                         });
  EXPECT_GE(steps, 5);
  EXPECT_EQ(1U, record.identifier);  // failures use up none
  qsUtilHS_MatchFilterSpecErase(&record, &key, 1);
  EXPECT_EQ(0, qsUtilHS_UnegisterFilterSpec(&record));
  EXPECT_LE(tests::memory_faults::live(), before + 40);  // tables, and the list of failures
}

TEST(ServicesFaults, ADescriptorIsHadOrNot) {
  lumra_resampler_descriptor *out = nullptr;
  std::vector<std::int32_t> seen;
  for_every_allocation([&] { return qsUtilHS_FFTResampler_CSG_CreateDescriptor(&out, 120, 1, 1, 77); },
                       [&](std::int64_t status, bool, const std::vector<std::int32_t> &codes) {
                         EXPECT_EQ(status == 0, out != nullptr);
                         if (status != 0) seen.push_back(static_cast<std::int32_t>(status));
                         if ((status == -50397544 || status == -46) && codes.size() > 1) {
                           EXPECT_EQ((std::vector<std::int32_t>{static_cast<std::int32_t>(status), -50397566}), codes);
                         }
                       });
  for (const std::int32_t code : {-50397684, -50397544, -46})
    EXPECT_NE(seen.end(), std::find(seen.begin(), seen.end(), code)) << code;
  EXPECT_EQ(1, tests::mkl_faults::live_descriptors());
  // A descriptor that was lent before goes back where it came from.
  const lumra_resampler_descriptor *const known = out;
  qsUtilHS_FreeArrayIDH_CSG(77);
  for_every_allocation([&] { return qsUtilHS_FFTResampler_CSG_CreateDescriptor(&out, 120, 1, 1, 77); },
                       [&](std::int64_t status, bool, const std::vector<std::int32_t> &) {
                         if (status == 0) {
                           EXPECT_EQ(known, out);
                         }
                       });
  EXPECT_EQ(known, out);
  qsUtilHS_FreeArrayIDH_CSG(77);
}

TEST(ServicesFaults, TransformsThatCannotBeSetUpAreNamed) {
  const std::int32_t codes[2][4] = {{-50397485, -50397506, -50397513, 0}, {-50397485, -50397494, -50397499, -50397513}};
  const int live = tests::mkl_faults::live_descriptors();
  for (const std::uint32_t inverse : {0U, 1U})
    for (int n = 1; n <= 4 && codes[inverse][n - 1] != 0; ++n) {
      lumra_resampler_descriptor *out = nullptr;
      const tests::recorded list;
      std::int32_t status = 0;
      {
        const tests::mkl_faults::fail_at armed(n);
        status = qsUtilHS_FFTResampler_CSG_CreateDescriptor(&out, 90, 1, inverse, 78);
      }
      EXPECT_EQ(codes[inverse][n - 1], status);
      EXPECT_EQ(nullptr, out);
      EXPECT_EQ((std::vector<std::int32_t>{status, -50397566}), list.codes());
      EXPECT_EQ(live, tests::mkl_faults::live_descriptors());
    }
  // A transform of another length: query and free may fail, too.
  const std::int32_t again[] = {-50397466, -50397473, -50397485};
  for (int n = 1; n <= 3; ++n) {
    lumra_resampler_descriptor descriptor{};
    ASSERT_EQ(0, qsrfhs::prepare(descriptor, 32, false));
    const tests::recorded list;
    {
      const tests::mkl_faults::fail_at armed(n);
      EXPECT_EQ(again[n - 1], qsrfhs::prepare(descriptor, 48, false));
    }
    EXPECT_EQ(nullptr, descriptor.transform);
    EXPECT_EQ(again[n - 1], list.codes().front());
    EXPECT_EQ(live, tests::mkl_faults::live_descriptors());
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
    const tests::recorded list;
    {
      const tests::mkl_faults::fail_at armed(n);
      qsrfhs::process_block({32, 16, 0}, *forward, *inverse, x.data(), spectrum.data(), 0, true, {&channel, 1});
    }
    const auto codes = list.codes();
    ASSERT_FALSE(codes.empty()) << n;
    EXPECT_EQ(expected[n - 1][0], codes[0]) << n;
    if (expected[n - 1][1] != 0) {
      EXPECT_EQ(expected[n - 1][1], codes.at(1)) << n;
    }
    EXPECT_EQ(16U, channel.produced);
  }
  qsUtilHS_FreeArrayIDH_CSG(79);
}

}  // namespace
