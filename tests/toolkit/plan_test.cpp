// The C++ functions over spans, and the objects that keep a stream. SPDX-License-Identifier: MIT
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
  const auto x = noise<E>(48);
  const std::vector<T> impulse{0, 1};
  reference delayed = wide(x), reversed(delayed.rbegin(), delayed.rend()), power = dft(wide(x));
  delayed.insert(delayed.begin(), 0);
  reversed.insert(reversed.begin(), 0);
  for (auto &v : reversed) v = std::conj(v);
  for (auto &p : power) p = std::norm(p) / (48.0 * 48.0);
  lumra::plan<T> plan;
  const auto expect = [](const auto &got, const reference &want) {
    EXPECT_LT(error_in_epsilons<E>(got, want), 2 * transform_bound(49));
  };
  const auto bins = lumra::fft(plan, x);
  expect(bins, dft(wide(x)));
  expect(lumra::inverse_fft(plan, bins), wide(x));
  const auto transform = *plan.slot();
  lumra::inverse_fft(plan, bins);
  EXPECT_EQ(transform, *plan.slot());
  expect(lumra::power_spectrum(plan, x), power);
  expect(lumra::convolve(plan, x, impulse), delayed);
  EXPECT_EQ(47U, lumra::convolve(plan, x, impulse, lumra::part::valid, lumra::method::direct).size());
  expect(lumra::correlate(plan, std::span(x), std::span(impulse)), reversed);
  const auto hann = lumra::apply_window(plan, std::vector<T>(4, T(1)), lumra::cosine_window::hann);
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

TYPED_TEST(Plan, StreamsContinueAndReset) {
  using T = toolkit::value_of<TypeParam>;
  using real = toolkit::real_of<TypeParam>;
  std::vector<T> x(90);
  for (std::size_t i = 0; i < x.size(); ++i) x[i] = static_cast<real>(static_cast<int>(i * 13 % 17) - 8);
  const std::vector<real> h(40, real{1} / 40), b{1, 2}, a{1, real{-0.5}};
  lumra::resampler<T> rate(h, 8, {1.5F});
  lumra::iir_filter<T> filter(b, a);
  const auto in_blocks = [&](auto &object, std::size_t block) {
    std::vector<T> all;
    object.reset();
    for (std::size_t i = 0; i < x.size(); i += block) {
      const auto part = object(std::span(x).subspan(i, block));
      all.insert(all.end(), part.begin(), part.end());
    }
    return all;
  };
  EXPECT_EQ(in_blocks(rate, 90), in_blocks(rate, 9));
  EXPECT_EQ(in_blocks(filter, 90), in_blocks(filter, 9));
  EXPECT_THROW(rate({}), lumra::error);
  EXPECT_EQ(in_blocks(rate, 90), in_blocks(rate, 3));
  lumra::host_array<T> four(4);
  for (auto &v : four.elements()) v = 3;
  EXPECT_EQ(3, lumra::rms(four));
  EXPECT_EQ(2U, lumra::decimate(four, 2, true).size());
}

TEST(Plan, NoneIsNeededToFitAndSolve) {
  lumra::host_array<double> x(3), y(3);
  for (std::size_t i = 0; i < 3; ++i)
    x.elements()[i] = static_cast<double>(i), y.elements()[i] = 2.0 * static_cast<double>(i) + 1;
  EXPECT_EQ(2, lumra::linear_fit(y, x).slope);
  lumra::host_matrix<float> a(2, 2);
  a.row(0)[0] = 2, a.row(1)[1] = 4;
  lumra::host_array<float> b(2);
  b.elements()[0] = 2, b.elements()[1] = 8;
  const auto solution = lumra::least_squares(a, b);
  EXPECT_FLOAT_EQ(1, solution.elements()[0]);
  EXPECT_FLOAT_EQ(2, solution.elements()[1]);
  EXPECT_EQ(16, lumra::multiply(a, a).row(1)[1]);
  EXPECT_EQ(32, lumra::multiply(a, b).elements()[1]);
}

}  // namespace
