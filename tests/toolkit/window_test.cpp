// SPDX-License-Identifier: MIT
#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

struct window {
  int type;
  std::vector<double> a;
};
const window windows[] = {
    {0, {1.0}},
    {1, {0.5, 0.5}},
    {2, {0.54, 0.46}},
    {3, {0.42323, 0.49755, 0.07922}},
    {4, {7938.0 / 18608, 9240.0 / 18608, 1430.0 / 18608}},
    {5, {0.42, 0.5, 0.08}},
    {6, {0.215578948, 0.41663158, 0.277263158, 0.083578947, 0.006947368}},
    {7, {0.35875, 0.48829, 0.14128, 0.01168}},
    {8,
     {0.27105140069342415, 0.43329793923448606, 0.21812299954311062, 0.0659254463880309, 0.010811742098372268,
      0.0007765848252250934, 1.3887217350903198e-05}},
    {9, {0.323215218, 0.471492057, 0.17553428, 0.028497078, 0.001261367}},
    {11, {0.3635819, 0.4891775, 0.1365995, 0.0106411}},
};

/// The cosine sum in extended precision.
double window_at(const window &w, std::size_t i, std::size_t n, bool normalised) {
  long double sum = 0;
  for (std::size_t k = 0; k < w.a.size(); ++k) {
    const auto turns = static_cast<long double>(k * i % n) / static_cast<long double>(n);
    sum += (k % 2 == 0 ? 1 : -1) * static_cast<long double>(w.a[k]) *
           std::cos(2 * std::numbers::pi_v<long double> * turns);
  }
  return static_cast<double>(sum / (normalised ? w.a[0] : 1.0));
}

template <class E>
using Window = toolkit_test<E>;
TYPED_TEST_SUITE(Window, all_letters);

TYPED_TEST(Window, AgreesWithTheCosineSum) {
  using E = TypeParam;
  for (const window &w : windows) {
    for (const std::size_t n : {2U, 3U, 4U, 511U, 512U, 513U, 10000U}) {
      for (const bool normalised : {false, true}) {
        SCOPED_TRACE(testing::Message() << "type " << w.type << ", " << n << " samples");
        const auto x = noise<E>(n);
        array_of<E> data = filled<E>(x);
        f64_array scratch(std::size_t{5});
        ASSERT_EQ(0, family<E>::window(data, w.type, normalised, scratch));
        EXPECT_EQ(0, scratch.block()->count);
        double worst = 0;
        for (std::size_t i = 0; i < n; ++i) {
          const double want = window_at(w, i, n, normalised);
          const auto got = std::complex<double>(values<E>(data)[i]);
          const double size = std::abs(std::complex<double>(x[i])) * (normalised ? 1 / w.a[0] : 1.0);
          // One rounding of the window and one of the product, relative to the window's own value.
          const double allowed = toolkit::is_double<E> ? 1e-14 : 1.2e-7 * std::abs(want) + 1e-14;
          worst = std::max(worst, std::abs(got - std::complex<double>(x[i]) * want) / (size * allowed));
        }
        EXPECT_LE(worst, 1.0);
      }
    }
  }
}

TEST(LongWindow, DoesNotDrift) {
  fake_host host(fake_host::unit::elements);
  constexpr std::size_t n = 10'000'000;
  for (const int type : {1, 6, 8}) {
    f64_array data(n), scratch;
    f32_array single(n);
    for (std::size_t i = 0; i < n; ++i) single.elements()[i] = static_cast<float>(data.elements()[i] = 1.0);
    ASSERT_EQ(0, qsRFPELTA_dAllCosWinH(data, type, 0, scratch));
    ASSERT_EQ(0, qsRFPELTA_sAllCosWinH(single, type, 0, scratch));
    const window &w = windows[type];
    double worst = 0, worst_single = 0;
    for (std::size_t i = 0; i < n; i += 97) {
      const double want = window_at(w, i, n, false);
      worst = std::max(worst, std::abs(data.elements()[i] - want));
      const auto nearest = static_cast<float>(want);
      const double ulp = std::max(std::abs(std::nextafter(nearest, 2.F) - nearest), std::numeric_limits<float>::min());
      worst_single = std::max(worst_single, std::abs(single.elements()[i] - static_cast<double>(nearest)) / ulp);
    }
    EXPECT_LT(worst, 1e-14) << "type " << type;
    EXPECT_LE(worst_single, 1.0) << "type " << type;
  }
}

TYPED_TEST(Window, OneSampleStays) {
  using E = TypeParam;
  const auto x = noise<E>(1);
  for (const int type : {0, 6, 10, -1}) {
    array_of<E> data = filled<E>(x);
    EXPECT_EQ(0, family<E>::window(data, type, 1, nullptr));
    EXPECT_EQ(x[0], values<E>(data)[0]);
  }
}

}  // namespace
