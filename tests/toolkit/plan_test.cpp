// The C++ functions over spans. SPDX-License-Identifier: MIT
#include <lumra/lumra.hpp>

#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

template <class E>
class Plan : public testing::Test {};
TYPED_TEST_SUITE(Plan, all_letters);

// Which export a type is sent to shows in what comes back: each result is one that no other operation gives.
TYPED_TEST(Plan, SendsEachTypeToItsExport) {
  using E = TypeParam;
  using T = toolkit::value_of<E>;
  const auto x = noise<E>(48, 1), y = noise<E>(5, 2);
  lumra::plan<T> plan;
  const auto bins = lumra::fft(plan, x);
  EXPECT_LT(error_in_epsilons<E>(bins, dft(wide(x))), transform_bound(48));
  EXPECT_LT(error_in_epsilons<E>(lumra::inverse_fft(plan, bins), wide(x)), 2 * transform_bound(48));
  const auto transform = *plan.slot();
  lumra::inverse_fft(plan, bins);
  EXPECT_EQ(transform, *plan.slot());

  reference power = dft(wide(x));
  for (auto &p : power) p = std::norm(p) / (48.0 * 48.0);
  EXPECT_LT(error_in_epsilons<E>(lumra::power_spectrum(plan, x), power), 2 * transform_bound(48));

  reference full(52), lags(52);
  for (std::size_t i = 0; i < 48; ++i) {
    for (std::size_t j = 0; j < 5; ++j) {
      full[i + j] += std::complex<double>(x[i]) * std::complex<double>(y[j]);
      lags[47 - i + j] += std::conj(std::complex<double>(x[i])) * std::complex<double>(y[j]);
    }
  }
  EXPECT_LT(error_in_epsilons<E>(lumra::convolve(plan, x, y), full), transform_bound(52));
  EXPECT_EQ(44U, lumra::convolve(plan, x, y, lumra::part::valid, lumra::method::direct).size());
  EXPECT_LT(error_in_epsilons<E>(lumra::correlate(plan, std::span(x), std::span(y)), lags), transform_bound(52));

  const std::vector<T> ones(4, T(1));
  const auto hann = lumra::apply_window(plan, ones, lumra::cosine_window::hann);
  EXPECT_EQ(T(0), hann[0]);
  EXPECT_EQ(T(1), hann[2]);
  EXPECT_THROW(lumra::fft(plan, {}), lumra::error);
}

TEST(Plan, CorrelatesRealWithComplex) {
  lumra::plan<std::complex<float>> plan;
  const std::vector<float> real{1.F, 2.F};
  const std::vector<std::complex<float>> complex{{0.F, 1.F}};
  const auto first =
      lumra::correlate(plan, std::span(real), std::span(complex), lumra::normalisation::none, lumra::method::direct);
  EXPECT_EQ((std::vector<std::complex<float>>{{0.F, 2.F}, {0.F, 1.F}}), (std::vector(first.begin(), first.end())));
  const auto second =
      lumra::correlate(plan, std::span(complex), std::span(real), lumra::normalisation::none, lumra::method::direct);
  EXPECT_EQ((std::vector<std::complex<float>>{{0.F, -1.F}, {0.F, -2.F}}), (std::vector(second.begin(), second.end())));
}

}  // namespace
