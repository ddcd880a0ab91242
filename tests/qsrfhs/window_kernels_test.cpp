// Windows and weights in double precision: all builds give the bits of the definition, none fuses.
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
        table->window_values(turned, polynomial.data(), terms, narrow.as<float>(), 48);
        table->window_values_double(turned, polynomial.data(), terms, exact.as<double>(), 48);
        for (std::size_t k = 0; k < 48; ++k) {
          const double sine = -0.6 * angles[k] + 0.8 * angles[512 + k], u = sine * sine;
          double w = polynomial[terms - 1];
          for (std::size_t j = terms - 1; j-- > 0;) w = w * u + polynomial[j];
          EXPECT_EQ(w, exact.as<double>()[k]) << b.name << ' ' << terms;
          EXPECT_EQ(static_cast<float>(w), narrow.as<float>()[k]) << b.name << ' ' << terms;
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

}  // namespace
