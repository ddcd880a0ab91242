// Transforms that fail in the core services, at every step. SPDX-License-Identifier: MIT
#include <lumra/array_store.h>
#include <lumra/fft_resampler.h>

#include <gtest/gtest.h>

#include <complex>
#include <vector>

#include "qsrfhs/vector/fft_resampler.hpp"
#include "support/faults.hpp"
#include "support/recorded.hpp"

namespace {

using namespace tests;
using codes = std::vector<std::int32_t>;

TEST(ServicesFaults, TransformsThatCannotBeSetUpAreNamed) {
  const nothing_left in_the_end(transforms);
  const codes expected[] = {{-50397485, -50397506, -50397513}, {-50397485, -50397499, -50397494, -50397513}};
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
    ASSERT_EQ(0, qsrfhs::prepare(descriptor, 32, qsrfhs::direction::forward));
    const recorded list;
    {
      const fail_at armed(transforms, n);
      EXPECT_EQ(again[n - 1], qsrfhs::prepare(descriptor, 48, qsrfhs::direction::forward));
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
    ASSERT_EQ(0, qsrfhs::prepare(*forward, 32, qsrfhs::direction::forward));
    ASSERT_EQ(0, qsrfhs::prepare(*inverse, 16, qsrfhs::direction::inverse));
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
