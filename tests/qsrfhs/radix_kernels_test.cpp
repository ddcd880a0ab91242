// The first pass of long transforms: all builds follow the definition, and those that round alike give the same bits.
// And the bins that are taken out of rows.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <complex>
#include <cstddef>
#include <cstring>
#include <initializer_list>
#include <limits>
#include <numbers>
#include <string>
#include <utility>
#include <vector>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "support/guarded.hpp"
#include "support/signals.hpp"

namespace {

using namespace qsrfhs::kernels;

// Rows of complex samples are a multiple of 4096 bytes apart, where some builds load whole lines.
constexpr std::size_t row = 32 * radix_group, gap = 8, stride = row + gap;

enum class samples_are { complex, complex_without_window, real };

template <class Real>
std::vector<std::complex<double>> expected(const std::vector<std::complex<double>> &x, std::size_t rows,
                                           const radix_plan<Real> &plan) {
  std::vector<std::complex<double>> out(rows * row);
  for (std::size_t k = 0; k < rows; ++k) {
    for (std::size_t n = 0; n < row; ++n) {
      const std::size_t group = n / radix_group, i = n % radix_group;
      std::complex<double> sum;
      for (std::size_t r = 0; r < radix; ++r) {
        const double w = plan.window ? plan.window[(group * radix + r) * radix_group + i] : 1;
        sum += x[r * row + n] * w * std::polar(1.0, -2 * std::numbers::pi * static_cast<double>(k * r % 16) / 16);
      }
      const Real *const near = plan.near + 2 * k * radix_group, *const far = plan.far + 2 * (group * radix + k);
      out[k * row + n] = sum;
      if (k != 0)  // the factors of row 0 are 1
        out[k * row + n] *= std::complex<double>(near[i], near[radix_group + i]) * std::complex<double>(far[0], far[1]);
    }
  }
  return out;
}

template <class Real>
void expect_radix(samples_are kind, void (*kernel_table::*kernel)(const Real *, const radix_plan<Real> &, Real *)) {
  const bool complex = kind != samples_are::real, windowed = kind != samples_are::complex_without_window;
  const auto x = tests::noise_of<Real>((complex ? 2 : 1) * radix * row, 1);
  std::vector<std::complex<double>> wide(radix * row);
  for (std::size_t i = 0; i < wide.size(); ++i)
    wide[i] = complex ? std::complex<double>(x[2 * i], x[2 * i + 1]) : std::complex<double>(x[i]);
  const std::size_t rows = complex ? radix : radix / 2 + 1, length = 2 * (rows * stride - gap);
  std::vector<Real> first[2];
  // Samples that begin on a line of the caches, behind one and in front of one.
  for (const auto &[at, odd] : std::initializer_list<std::pair<tests::edge, std::size_t>>{
           {tests::edge::front, 0}, {tests::edge::back, 0}, {tests::edge::front, 5}, {tests::edge::back, 6}}) {
    const bool is_behind = at == tests::edge::front;
    auto padded = x;
    padded.insert(is_behind ? padded.begin() : padded.end(), odd, Real{7});
    const tests::guarded samples(padded, at), window(tests::noise_of<Real>(radix * row, 2), at);
    const tests::guarded near(tests::noise_of<Real>(2 * radix * radix_group, 3), at);
    const tests::guarded far(tests::noise_of<Real>(2 * row, 4), at);
    const radix_plan<Real> plan{row, stride, windowed ? window.as<Real>() : nullptr, near.as<Real>(), far.as<Real>()};
    const auto values = expected(wide, rows, plan);
    for (const build &b : builds()) {
      for (const bool fused : {false, true}) {
        if (fused && b.fused == b.exact) continue;
        const std::string what = b.name + std::string(fused ? " fused" : "");
        const tests::guarded out(std::vector<Real>(length, 7), at);
        ((fused ? b.fused : b.exact)->*kernel)(samples.as<Real>() + (is_behind ? odd : 0), plan, out.as<Real>());
        const std::vector<Real> got(out.as<Real>(), out.as<Real>() + length);
        for (std::size_t i = 0; i < length / 2; ++i) {
          const std::size_t k = i / stride, n = i % stride;
          const std::complex<double> actual(got[2 * i], got[2 * i + 1]);
          if (n >= row)
            EXPECT_EQ(actual, std::complex<double>(7, 7)) << what;
          else
            EXPECT_LT(std::abs(actual - values[k * row + n]), 100 * std::numeric_limits<Real>::epsilon())
                << what << ' ' << k << ' ' << n;
        }
        if (first[fused].empty()) first[fused] = got;
        EXPECT_EQ(0, std::memcmp(got.data(), first[fused].data(), length * sizeof(Real))) << what;
      }
    }
  }
}

TEST(RadixKernels, FollowTheirDefinition) {
  expect_radix<float>(samples_are::complex, &kernel_table::windowed_radix_16);
  expect_radix<double>(samples_are::complex, &kernel_table::windowed_radix_16_double);
  expect_radix<float>(samples_are::complex_without_window, &kernel_table::radix_16);
  expect_radix<double>(samples_are::complex_without_window, &kernel_table::radix_16_double);
  expect_radix<float>(samples_are::real, &kernel_table::windowed_real_radix_16);
  expect_radix<double>(samples_are::real, &kernel_table::windowed_real_radix_16_double);
}

TEST(RadixKernels, WeighBinsOfRows) {
  const tests::guarded rows(tests::noise_of<float>(2 * (radix * stride - gap), 1), tests::edge::back);
  std::vector<float> bins(2 * radix * row);
  for (std::size_t i = 0; i < bins.size(); ++i)
    bins[i] = rows.as<float>()[2 * (i / 2 % radix * stride + i / 2 / radix) + i % 2];
  const auto weights = tests::noise_of<float>(bins.size(), 2);
  for (const build &b : builds()) {
    for (const kernel_table *table : {b.exact, b.fused}) {
      for (const auto &[first, n] : std::initializer_list<std::pair<std::size_t, std::size_t>>{
               {0, radix * row}, {5, 0}, {17, 1}, {127, 2}, {131, 500}, {radix * row - 130, 130}}) {
        std::vector<float> expected(2 * n + 1, 7), got = expected;
        table->weigh_and_rotate(bins.data() + 2 * first, weights.data(), 0.6F, -0.8F, expected.data(), n);
        table->weigh_and_rotate_rows(rows.as<float>(), stride, first, weights.data(), 0.6F, -0.8F, got.data(), n);
        EXPECT_EQ(expected, got) << b.name << ' ' << first << ' ' << n;
      }
    }
  }
}

}  // namespace
