// The loops around transforms: both builds give exactly what the definition says. SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>
#include <vector>

#include "qsrfhs/vector/kernels/kernels.hpp"

namespace {

using qsrfhs::kernels::kernel_table;

std::vector<float> noise(std::size_t n, unsigned seed) {
  std::vector<float> out(n);
  for (float &v : out) {
    seed = seed * 1664525U + 1013904223U;
    v = static_cast<float>(seed >> 8) / 8388608.F - 1.F;
  }
  return out;
}

TEST(TransformKernels, BothBuildsAgreeWithTheDefinition) {
  for (const kernel_table *table : {&qsrfhs::kernels::baseline_kernels, &qsrfhs::kernels::active()}) {
    for (const std::size_t n : {0U, 1U, 3U, 4U, 7U, 8U, 9U, 17U, 35U}) {
      for (std::size_t offset = 0; offset < 8; ++offset) {
        SCOPED_TRACE(testing::Message() << n << " elements, offset " << offset);
        const auto x = noise(2 * n, 1), y = noise(2 * n, 2);
        std::vector<float> want(2 * n), got(2 * n + offset);
        for (std::size_t k = 0; k < n; ++k) {
          want[2 * k] = x[2 * (n - 1 - k)];
          want[2 * k + 1] = -x[2 * (n - 1 - k) + 1];
        }
        table->reverse_conjugate(x.data(), got.data() + offset, n);
        EXPECT_TRUE(std::equal(want.begin(), want.end(), got.begin() + static_cast<std::ptrdiff_t>(offset)));

        for (const double factor : {1.0 / 1024, 1.0 / 3}) {
          std::vector<float> power(n), out(n + offset), mirror(n + offset);
          for (std::size_t k = 0; k < n; ++k) {
            const float squares = x[2 * k] * x[2 * k] + x[2 * k + 1] * x[2 * k + 1];
            power[k] = static_cast<float>(static_cast<double>(squares) * factor);
          }
          table->scaled_power(x.data(), out.data() + offset, mirror.data() + offset, factor, n);
          EXPECT_TRUE(std::equal(power.begin(), power.end(), out.begin() + static_cast<std::ptrdiff_t>(offset)));
          EXPECT_TRUE(std::equal(power.rbegin(), power.rend(), mirror.begin() + static_cast<std::ptrdiff_t>(offset)));
        }

        std::copy(x.begin(), x.end(), got.begin() + static_cast<std::ptrdiff_t>(offset));
        for (std::size_t k = 0; k < n; ++k) {
          const float re = x[2 * k], im = x[2 * k + 1];
          want[2 * k] = re * y[2 * k] - im * y[2 * k + 1];
          want[2 * k + 1] = im * y[2 * k] + re * y[2 * k + 1];
        }
        table->multiply(got.data() + offset, y.data(), n);
        EXPECT_TRUE(std::equal(want.begin(), want.end(), got.begin() + static_cast<std::ptrdiff_t>(offset)));
      }
    }
  }
}

}  // namespace
