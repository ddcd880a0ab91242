// The stateful objects and plain functions of lumra.hpp. SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <complex>
#include <lumra/lumra.hpp>
#include <vector>

namespace {

template <class T>
class Stream : public testing::Test {};
using all_types = testing::Types<float, double, std::complex<float>, std::complex<double>>;
TYPED_TEST_SUITE(Stream, all_types);

TYPED_TEST(Stream, ObjectsContinueAndResetTheirStreams) {
  using real = lumra::detail::real_of<TypeParam>;
  std::vector<TypeParam> x(90);
  for (std::size_t i = 0; i < x.size(); ++i) x[i] = static_cast<real>(static_cast<int>(i * 13 % 17) - 8);
  const std::vector<real> h(40, real{1} / 40), b{1, 2}, a{1, real{-0.5}};
  lumra::resampler<TypeParam> rate(h, 8, {1.5F});
  lumra::iir_filter<TypeParam> filter(b, a);
  const auto in_blocks = [&](auto &object, std::size_t block) {
    std::vector<TypeParam> all;
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
  lumra::host_array<TypeParam> four(4);
  for (auto &v : four.elements()) v = 3;
  EXPECT_EQ(3, lumra::rms(four));
  EXPECT_EQ(2U, lumra::decimate(four, 2, true).size());
}

TEST(Plain, FitsAndSolves) {
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
