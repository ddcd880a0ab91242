// Windows, weights and planes in double precision: all builds give the bits of the definition, none fuses.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <cmath>
#include <cstddef>
#include <vector>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "support/guarded.hpp"
#include "support/signals.hpp"

namespace {

using namespace qsrfhs::kernels;

/// Records of n samples, which the window weighs from both ends.
template <class Real, std::size_t parts, class Kernel>
void expect_window(const build &b, Kernel kernel_table::*kernel, std::size_t terms, std::size_t n) {
  const auto polynomial = tests::noise_of<double>(7, 1), angles = tests::noise_of<double>(1024, 2);
  const auto x = tests::noise_of<Real>(parts * n, 3), y = tests::noise_of<Real>(parts * n, 4);
  for (const kernel_table *table : {b.exact, b.fused}) {
    const tests::guarded rising(x, tests::edge::back), falling(y, tests::edge::front);
    (table->*kernel)({angles.data(), angles.data() + 512, 0.8, -0.6}, polynomial.data(), terms, rising.as<Real>(),
                     falling.as<Real>(), n);
    for (std::size_t k = 0; k < parts * n; ++k) {
      const std::size_t at = k / parts, back = parts * (n - 1 - at) + k % parts;
      const double sine = -0.6 * angles[at] + 0.8 * angles[512 + at], u = sine * sine;
      double w = polynomial[terms - 1];
      for (std::size_t j = terms - 1; j-- > 0;) w = w * u + polynomial[j];
      ASSERT_EQ(x[k] * static_cast<Real>(w), rising.as<Real>()[k]) << b.name << ' ' << terms << ' ' << n;
      ASSERT_EQ(y[back] * static_cast<Real>(w), falling.as<Real>()[back]) << b.name << ' ' << terms << ' ' << n;
    }
  }
}

TEST(WindowKernels, FollowTheirDefinition) {
  for (const build &b : builds()) {
    for (const std::size_t terms : {2U, 3U, 4U, 5U, 7U})
      for (const std::size_t n : {0U, 1U, 7U, 8U, 63U, 64U, 65U, 130U, 512U}) {
        expect_window<float, 1>(b, &kernel_table::cosine_window, terms, n);
        expect_window<double, 1>(b, &kernel_table::cosine_window_double, terms, n);
        expect_window<float, 2>(b, &kernel_table::complex_cosine_window, terms, n);
        expect_window<double, 2>(b, &kernel_table::complex_cosine_window_double, terms, n);
      }
    const auto x = tests::noise_of<double>(80, 2);
    for (std::size_t n = 0; n < 40; ++n) {
      const tests::guarded out(n * sizeof(double), tests::edge::back);
      b.exact->weigh_double(x.data(), x.data() + 40, out.as<double>(), n);
      for (std::size_t k = 0; k < n; ++k) EXPECT_EQ(x[k] * x[40 + k], out.as<double>()[k]) << b.name;
    }
  }
}

template <class Real, class Split, class Join>
void expect_planes(Split kernel_table::*split, Join kernel_table::*join) {
  const auto x = tests::noise_of<Real>(80, 3);
  for (const build &b : builds()) {
    for (std::size_t n = 0; n < 40; ++n) {
      const tests::guarded re(8 * n, tests::edge::back), im(8 * n, tests::edge::back);
      const tests::guarded back(2 * n * sizeof(Real), tests::edge::back);
      (b.exact->*split)(x.data() + 80 - 2 * n, re.as<double>(), im.as<double>(), n);
      (b.exact->*join)(re.as<double>(), im.as<double>(), back.as<Real>(), n);
      for (std::size_t k = 0; k < 2 * n; ++k) {
        EXPECT_EQ(double{x[80 - 2 * n + k]}, (k % 2 == 0 ? re : im).as<double>()[k / 2]) << b.name;
        EXPECT_EQ(x[80 - 2 * n + k], back.as<Real>()[k]) << b.name;
      }
    }
  }
}

TEST(PlaneKernels, SplitAndJoin) {
  expect_planes<float>(&kernel_table::split, &kernel_table::join_planes);
  expect_planes<double>(&kernel_table::split_double, &kernel_table::join_planes_double);
}

TEST(PlaneKernels, FindWhatIsNotFinite) {
  for (const build &b : builds())
    for (std::size_t n = 1; n < 70; ++n) {
      std::vector<double> x(n, 1e308);
      EXPECT_TRUE(b.exact->is_finite(x.data(), n)) << b.name;
      x[n * 7 / 11] = n % 2 ? -INFINITY : NAN;
      EXPECT_FALSE(b.exact->is_finite(x.data(), n)) << b.name << ' ' << n;
    }
}

}  // namespace
