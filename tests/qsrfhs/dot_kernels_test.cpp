// Dot products with taps: both builds give the same bits, and the sums of the definition. SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <array>
#include <limits>
#include <vector>

#include "qsrfhs/vector/kernels/kernels.hpp"

namespace {

using qsrfhs::kernels::kernel_table;

/// n values and, up to a multiple of 8, others that must not count.
std::vector<float> values(std::size_t n, unsigned seed, std::size_t used) {
  std::vector<float> out((n + 7) / 8 * 8, std::numeric_limits<float>::quiet_NaN());
  for (std::size_t k = 0; k < used; ++k) {
    seed = seed * 1664525U + 1013904223U;
    out[k] = static_cast<float>(seed >> 8) / 8388608.F - 1.F;
  }
  return out;
}

/// Of each kernel in turn: real, real between, complex, complex between.
std::array<float, 6> results(const kernel_table &table, const float *h0, const float *h1, const float *x,
                             const float *z, std::size_t n) {
  std::array<float, 6> out{table.dot(h0, x, n), table.dot_between(h0, h1, 0.3F, x, n)};
  table.complex_dot(h0, z, n, &out[2]);
  table.complex_dot_between(h0, h1, 0.3F, z, n, &out[4]);
  return out;
}

TEST(DotKernels, BothBuildsAgreeWithTheDefinition) {
  for (std::size_t n = 0; n < 70; ++n) {
    SCOPED_TRACE(n);
    const auto h0 = values(n, 1, n), h1 = values(n, 2, n), x = values(n, 3, n), z = values(2 * n, 4, 2 * n);
    std::array<double, 6> want{};
    for (std::size_t k = 0; k < n; ++k) {
      const auto a = static_cast<double>(h0[k]), between = a + 0.3 * (static_cast<double>(h1[k]) - a);
      const auto real = static_cast<double>(x[k]);
      const auto re = static_cast<double>(z[2 * k]), im = static_cast<double>(z[2 * k + 1]);
      const double terms[] = {a * real, between * real, a * re, a * im, between * re, between * im};
      for (std::size_t i = 0; i < want.size(); ++i) want[i] += terms[i];
    }
    const auto got = results(qsrfhs::kernels::baseline_kernels, h0.data(), h1.data(), x.data(), z.data(), n);
    for (std::size_t i = 0; i < want.size(); ++i) EXPECT_NEAR(want[i], static_cast<double>(got[i]), 4e-6);
    EXPECT_EQ(got, results(qsrfhs::kernels::active(), h0.data(), h1.data(), x.data(), z.data(), n));
  }
}

}  // namespace
