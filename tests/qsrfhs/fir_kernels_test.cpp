// Filters with fixed taps: all builds give the bits of the sum in its order, whatever lies around.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <cmath>
#include <initializer_list>
#include <limits>
#include <vector>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "support/signals.hpp"

namespace {

using namespace qsrfhs::kernels;

/// How products are rounded that something is added to.
enum class products { separate, fused };

/// a b + c.
template <class Real>
Real multiply_add(products how, Real a, Real b, Real c) {
  return how == products::fused ? std::fma(a, b, c) : a * b + c;
}

/// Calls work(table, how it rounds).
template <class Work>
void for_each_table(Work work) {
  for (const build &b : builds()) {
    work(*b.exact, products::separate);
    if (b.fused != b.exact) work(*b.fused, products::fused);
  }
}

/// Real taps for real and complex samples, then complex taps. `behind` must not enter any sum.
template <class Real, class Fir, class ComplexFir>
void expect_sums(Fir kernel_table::*fir, ComplexFir kernel_table::*complex_fir) {
  constexpr std::size_t behind = 32 / sizeof(Real);
  const auto taps = tests::noise_of<Real>(2 * 70, 1);
  for_each_table([&](const kernel_table &table, products how) {
    for (const std::size_t count : std::initializer_list<std::size_t>{1, 2, 3, 64, 70})
      for (const std::size_t n : std::initializer_list<std::size_t>{0, 1, 2, 3, 7, 8, 9, 31, 64, 100, 131}) {
        auto x = tests::noise_of<Real>(2 * (n + count - 1), 7);
        x.resize(x.size() + behind, std::numeric_limits<Real>::quiet_NaN());
        for (const std::size_t width : {std::size_t{1}, std::size_t{2}}) {
          std::vector<Real> expected(width * n), got(width * n);
          const Real *first = x.data() + width * (count - 1);
          for (std::size_t k = 0; k < width * n; ++k)
            for (std::size_t j = 0; j < count; ++j) {
              const Real sample = first[static_cast<std::ptrdiff_t>(k) - static_cast<std::ptrdiff_t>(width * j)];
              expected[k] = j == 0 ? taps[j] * sample : multiply_add(how, taps[j], sample, expected[k]);
            }
          (table.*fir)(first, taps.data(), count, width, got.data(), width * n);
          EXPECT_EQ(expected, got) << count << " taps, " << n << " outputs";
        }
        std::vector<Real> expected(2 * n), got(2 * n);
        const Real *first = x.data() + 2 * (count - 1);
        for (std::size_t k = 0; k < n; ++k) {
          Real sums[2][2] = {};  // by a tap's part, of a sample's part
          for (std::size_t j = 0; j < count; ++j)
            for (std::size_t of_tap = 0; of_tap < 2; ++of_tap)
              for (std::size_t of_sample = 0; of_sample < 2; ++of_sample) {
                const Real tap = taps[2 * j + of_tap], sample = *(first + 2 * k - 2 * j + of_sample);
                Real &sum = sums[of_tap][of_sample];
                sum = j == 0 ? tap * sample : multiply_add(how, tap, sample, sum);
              }
          expected[2 * k] = sums[0][0] - sums[1][1];
          expected[2 * k + 1] = sums[0][1] + sums[1][0];
        }
        (table.*complex_fir)(first, taps.data(), count, got.data(), n);
        EXPECT_EQ(expected, got) << count << " complex taps, " << n << " outputs";
      }
  });
}

TEST(FirKernels, SumsInOrder) {
  expect_sums<float>(&kernel_table::fir, &kernel_table::complex_fir);
  expect_sums<double>(&kernel_table::fir_double, &kernel_table::complex_fir_double);
}

TEST(FirKernels, ProductsOfSpectra) {
  for (const std::size_t n : std::initializer_list<std::size_t>{0, 1, 2, 5, 16, 33}) {
    const auto a = tests::noise_of<double>(2 * n, 1), b = tests::noise_of<double>(2 * n, 2);
    for_each_table([&](const kernel_table &table, products how) {
      std::vector<double> got(2 * n);
      table.multiply_double(a.data(), b.data(), got.data(), n);
      for (std::size_t k = 0; k < 2 * n; k += 2) {
        EXPECT_EQ(multiply_add(how, a[k], b[k], -(a[k + 1] * b[k + 1])), got[k]);
        EXPECT_EQ(multiply_add(how, a[k + 1], b[k], a[k] * b[k + 1]), got[k + 1]);
      }
    });
  }
}

}  // namespace
