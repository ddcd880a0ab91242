// SPDX-License-Identifier: MIT
#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

template <class E>
using Rms = toolkit_test<E>;
TYPED_TEST_SUITE(Rms, all_letters);

TYPED_TEST(Rms, AgreesWithTheDefinition) {
  using E = TypeParam;
  using real = toolkit::real_of<E>;
  for (const std::size_t n : {1U, 2U, 3U, 4U, 5U, 31U, 33U, 4095U, 4097U, 100001U}) {
    SCOPED_TRACE(n);
    const auto record = noise<E>(n);
    array_of<E> in = filled<E>(record);
    long double sum = 0;
    for (const auto &v : record) sum += std::norm(std::complex<long double>(v));
    const auto want = static_cast<double>(std::sqrt(sum / static_cast<long double>(n)));
    real got = 0;
    ASSERT_EQ(0, family<E>::rms(in, &got));
    const double bound = 10 + std::sqrt(static_cast<double>(n));
    EXPECT_NEAR(1, static_cast<double>(got) / want, bound * static_cast<double>(std::numeric_limits<real>::epsilon()));
    EXPECT_EQ(0, family<E>::rms(in, nullptr));
  }
}

template <class E>
struct fitted_line {
  using real = toolkit::real_of<E>;

  array_of<E> x, y, w;
  array_of<E> scratch = array_of<E>(std::size_t{0});
  real slope = 7, intercept = 7, residue = 7;
  std::int32_t iterations = 7;

  fitted_line(const std::vector<real> &xs, const std::vector<real> &ys, const std::vector<real> &ws = {})
      : x(std::span(xs)), y(std::span(ys)), w(std::span(ws)) {}
  std::int32_t run(int method, float tuning1 = 0, float tuning2 = 0, bool with_scratch = true) {
    return partial_family<E>::linear_fit(y, x, w, &slope, &intercept, &residue, method, tuning1, tuning2, &iterations,
                                         with_scratch ? scratch.handle() : nullptr);
  }
};

template <class E>
using LinearFit = toolkit_test<E>;
using real_letters = testing::Types<toolkit::s, toolkit::d>;
TYPED_TEST_SUITE(LinearFit, real_letters);

TYPED_TEST(LinearFit, LeastSquaresWeightedAndNot) {
  using real = toolkit::real_of<TypeParam>;
  constexpr double eps = std::numeric_limits<real>::epsilon();
  for (const double origin : {0.0, 1e6, -3e5}) {
    for (const int weighting : {0, 1, 2}) {  // none, alike, different
      SCOPED_TRACE(testing::Message() << "x from " << origin << ", weighting " << weighting);
      const std::size_t n = 101;
      const auto jitter = noise<TypeParam>(n, 3);
      std::vector<real> x(n), y(n), w(weighting ? n : 0);
      for (std::size_t i = 0; i < n; ++i) {
        x[i] = static_cast<real>(origin + static_cast<double>(i) / 16);
        y[i] = static_cast<real>(2.5 * static_cast<double>(i) / 16 - 40) + jitter[i];
        if (weighting) w[i] = weighting == 1 ? real{3} : static_cast<real>(i % 5);
      }
      // Normal equations in extended precision, from the first point on.
      long double s = 0, sx = 0, sy = 0, sxx = 0, sxy = 0;
      for (std::size_t i = 0; i < n; ++i) {
        const long double v = weighting ? w[i] : 1, u = static_cast<long double>(x[i]) - x[0], t = y[i];
        s += v, sx += v * u, sy += v * t, sxx += v * u * u, sxy += v * u * t;
      }
      const long double slope = (s * sxy - sx * sy) / (s * sxx - sx * sx), at_first = (sy - slope * sx) / s;
      long double residue = 0;
      std::vector<double> want;
      for (std::size_t i = 0; i < n; ++i) {
        const long double f = at_first + slope * (static_cast<long double>(x[i]) - x[0]);
        want.push_back(static_cast<double>(f));
        residue += (weighting ? w[i] : 1) * (y[i] - f) * (y[i] - f) / s;
      }
      fitted_line<TypeParam> fit(x, y, w);
      ASSERT_EQ(0, fit.run(0, 0, 0, weighting == 2));
      EXPECT_NEAR(1, fit.slope / static_cast<double>(slope), 10 * eps);
      EXPECT_NEAR(1, fit.intercept / static_cast<double>(at_first - slope * x[0]), 10 * eps);
      EXPECT_NEAR(1, fit.residue / static_cast<double>(residue), 100 * eps);
      EXPECT_EQ(0, fit.iterations);
      for (std::size_t i = 0; i < n; ++i) EXPECT_NEAR(want[i], values<TypeParam>(fit.y)[i], 40 * 4 * eps);
      EXPECT_EQ(0, fit.scratch.block()->count);
    }
  }
}

TYPED_TEST(LinearFit, RobustMethodsIgnoreGrossOutliers) {
  using real = toolkit::real_of<TypeParam>;
  for (const int method : {1, 2}) {
    for (const double spread : {0.0, 0.01}) {
      for (const bool weighted : {false, true}) {
        SCOPED_TRACE(testing::Message() << "method " << method << ", noise " << spread << ", weighted " << weighted);
        const std::size_t n = 200;
        const auto jitter = noise<TypeParam>(n, 5);
        std::vector<real> x(n), y(n), w(weighted ? n : 0, real{2});
        for (std::size_t i = 0; i < n; ++i) {
          x[i] = static_cast<real>(i) / 10;
          y[i] = static_cast<real>(0.75 * static_cast<double>(i) / 10 + 3 + spread * static_cast<double>(jitter[i]));
          if (i % 10 < 3) y[i] += static_cast<real>(100 + i);  // all to one side, more of it to the right
          if (weighted) w[i] += static_cast<real>(i % 3);
        }
        fitted_line<TypeParam> fit(x, y, w);
        ASSERT_EQ(0, fit.run(method, 1e-6F, 200));
        EXPECT_NEAR(0.75, fit.slope, 1e-4 + spread / 5);
        EXPECT_NEAR(3, fit.intercept, 1e-3 + spread);
        EXPECT_GT(fit.iterations, 1);
        EXPECT_LT(fit.iterations, 200);
        long double sum = 0, weights = 0;
        for (std::size_t i = 0; i < n; ++i) {
          const long double v = weighted ? w[i] : 1, d = static_cast<long double>(y[i]) - values<TypeParam>(fit.y)[i];
          sum += v * d * d, weights += v;
        }
        EXPECT_NEAR(1, fit.residue / static_cast<double>(sum / weights), 1e-5);
        fitted_line<TypeParam> once(x, y, w);
        ASSERT_EQ(0, once.run(method, 1e-6F, 1));
        EXPECT_EQ(1, once.iterations);
      }
    }
  }
}

}  // namespace
