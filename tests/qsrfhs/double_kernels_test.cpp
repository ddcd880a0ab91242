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

TEST(WindowKernels, FollowTheirDefinition) {
  const auto polynomial = tests::noise_of<double>(7, 1), angles = tests::noise_of<double>(1024, 2);
  for (const build &b : builds()) {
    for (const kernel_table *table : {b.exact, b.fused}) {
      for (const std::size_t terms : {2U, 3U, 4U, 5U, 7U}) {
        const turned_angles turned{angles.data(), angles.data() + 512, 0.8, -0.6};
        const tests::guarded narrow(48 * sizeof(float), tests::edge::back), exact(48 * 8, tests::edge::back);
        const tests::guarded narrow_mirror(48 * sizeof(float), tests::edge::front), mirror(48 * 8, tests::edge::front);
        table->window_values(turned, polynomial.data(), terms, narrow.as<float>(), narrow_mirror.as<float>(), 48);
        table->window_values_double(turned, polynomial.data(), terms, exact.as<double>(), mirror.as<double>(), 48);
        for (std::size_t k = 0; k < 48; ++k) {
          const double sine = -0.6 * angles[k] + 0.8 * angles[512 + k], u = sine * sine;
          double w = polynomial[terms - 1];
          for (std::size_t j = terms - 1; j-- > 0;) w = w * u + polynomial[j];
          EXPECT_EQ(w, exact.as<double>()[k]) << b.name << ' ' << terms;
          EXPECT_EQ(static_cast<float>(w), narrow.as<float>()[k]) << b.name << ' ' << terms;
          EXPECT_EQ(w, mirror.as<double>()[47 - k]) << b.name << ' ' << terms;
          EXPECT_EQ(static_cast<float>(w), narrow_mirror.as<float>()[47 - k]) << b.name << ' ' << terms;
        }
      }
      for (std::size_t n = 0; n < 40; ++n) {
        const tests::guarded out(n * sizeof(double), tests::edge::back);
        table->weigh_double(angles.data(), angles.data() + 512, out.as<double>(), n);
        for (std::size_t k = 0; k < n; ++k) EXPECT_EQ(angles[k] * angles[512 + k], out.as<double>()[k]) << b.name;
      }
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
