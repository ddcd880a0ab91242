// Filters with fixed taps: both builds give the bits of the sum in its order, whatever lies around.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <complex>
#include <initializer_list>
#include <limits>
#include <vector>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "support/signals.hpp"

namespace {

using namespace qsrfhs::kernels;

/// Real taps for real and complex samples, then complex taps. `behind` must not enter any sum.
template <class Real, class Fir, class ComplexFir>
void expect_sums(Fir kernel_table::*fir, ComplexFir kernel_table::*complex_fir) {
  constexpr std::size_t behind = 32 / sizeof(Real);
  const auto taps = tests::noise_of<Real>(2 * 70, 1);
  for (const kernel_table *table : {&baseline_kernels, &active()})
    for (const std::size_t count : std::initializer_list<std::size_t>{1, 2, 3, 64, 70})
      for (const std::size_t n : std::initializer_list<std::size_t>{0, 1, 2, 3, 7, 8, 9, 31, 64, 100, 131}) {
        auto x = tests::noise_of<Real>(2 * (n + count - 1), 7);
        x.resize(x.size() + behind, std::numeric_limits<Real>::quiet_NaN());
        for (const std::size_t width : {std::size_t{1}, std::size_t{2}}) {
          std::vector<Real> expected(width * n), got(width * n);
          const Real *first = x.data() + width * (count - 1);
          for (std::size_t k = 0; k < width * n; ++k)
            for (std::size_t j = 0; j < count; ++j) {
              const Real term =
                  taps[j] * first[static_cast<std::ptrdiff_t>(k) - static_cast<std::ptrdiff_t>(width * j)];
              expected[k] = j == 0 ? term : expected[k] + term;
            }
          (table->*fir)(first, taps.data(), count, width, got.data(), width * n);
          EXPECT_EQ(expected, got) << count << " taps, " << n << " outputs";
        }
        std::vector<Real> expected(2 * n), got(2 * n);
        const Real *first = x.data() + 2 * (count - 1);
        for (std::size_t k = 0; k < n; ++k) {
          std::complex<Real> by_re, by_im;
          for (std::size_t j = 0; j < count; ++j) {
            const Real *at = first + 2 * k - 2 * j;
            const std::complex<Real> sample(at[0], at[1]);
            by_re += taps[2 * j] * sample;
            by_im += taps[2 * j + 1] * sample;
          }
          expected[2 * k] = by_re.real() - by_im.imag();
          expected[2 * k + 1] = by_re.imag() + by_im.real();
        }
        (table->*complex_fir)(first, taps.data(), count, got.data(), n);
        EXPECT_EQ(expected, got) << count << " complex taps, " << n << " outputs";
      }
}

TEST(FirKernels, SumsInOrder) {
  expect_sums<float>(&kernel_table::fir, &kernel_table::complex_fir);
  expect_sums<double>(&kernel_table::fir_double, &kernel_table::complex_fir_double);
}

TEST(FirKernels, ProductsOfSpectra) {
  for (const std::size_t n : std::initializer_list<std::size_t>{0, 1, 2, 5}) {
    const auto a = tests::noise_of<double>(2 * n, 1), b = tests::noise_of<double>(2 * n, 2);
    for (const kernel_table *table : {&baseline_kernels, &active()}) {
      auto got = a;
      table->multiply_double(got.data(), b.data(), n);
      for (std::size_t k = 0; k < 2 * n; k += 2) {
        EXPECT_EQ(a[k] * b[k] - a[k + 1] * b[k + 1], got[k]);
        EXPECT_EQ(a[k + 1] * b[k] + a[k] * b[k + 1], got[k + 1]);
      }
    }
  }
}

}  // namespace
