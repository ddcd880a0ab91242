// SPDX-License-Identifier: MIT
#include <lumra/error_vector.h>

#include <gtest/gtest.h>

#include <cmath>
#include <complex>
#include <functional>

#include "support/signals.hpp"
#include "support/test_array.hpp"

namespace {

using cf32_matrix = tests::test_array<lumra_cf32_matrix_block>;
using f32_matrix = tests::test_array<lumra_f32_matrix_block>;

constexpr std::int32_t invalid_parameter = -312401;

struct comparison {
  const char *name;
  decltype(&qsLumraAlgo_CalculateEVM2D) call;
  double (*define)(std::complex<double> a, std::complex<double> b);
};

const comparison comparisons[] = {
    {"EVM", &qsLumraAlgo_CalculateEVM2D, [](auto a, auto b) { return std::abs(b - a); }},
    {"magnitude", &qsLumraAlgo_CalculateMagnitudeError2D, [](auto a, auto b) { return std::abs(b) - std::abs(a); }},
    {"phase", &qsLumraAlgo_CalculatePhaseError2D, [](auto a, auto b) { return std::arg(b * std::conj(a)); }}};

TEST(ErrorVector, MatchesItsDefinition) {
  for (const comparison &c : comparisons)
    for (const auto &[rows, columns] : {std::pair{1, 1}, {7, 9}, {1, 2048}, {3, 683}, {64, 129}}) {
      const auto n = static_cast<std::size_t>(rows * columns);
      const auto noise = tests::noise_of<lumra_cf32>(2 * n);
      cf32_matrix a(rows, columns, std::span(noise).first(n));
      cf32_matrix b(columns, rows, std::span(noise).last(n));  // only the number of elements matters
      f32_matrix e(1, rows * columns);
      // Units of the values: 2^-22 and 2^-23 of rounding, and half of the bits.
      for (const auto &[mode, bound] : {std::pair{1, 4e-6}, {2, 2e-6}, {3, 4e-3}}) {
        SCOPED_TRACE(testing::Message() << c.name << " n " << n << " mode " << mode);
        ASSERT_EQ(0, c.call(a.handle(), b.handle(), e.handle(), mode));
        for (std::size_t i = 0; i < n; ++i) {
          const lumra_cf32 x = a.block()->elements[i], y = b.block()->elements[i];
          ASSERT_NEAR(c.define({x.re, x.im}, {y.re, y.im}), e.block()->elements[i], bound) << i;
        }
      }
    }
}

TEST(ErrorVector, RefusesAndTouchesNothing) {
  cf32_matrix a(2, 6), b(3, 4), small(2, 5), none;
  f32_matrix e(4, 3), no_e, small_e(11, 1);
  e.block()->elements[0] = 7;
  const auto A = a.handle(), B = b.handle();
  for (const comparison &c : comparisons) {
    SCOPED_TRACE(c.name);
    for (const auto bad : {lumra_cf32_matrix{}, none.handle(), small.handle()}) {
      EXPECT_EQ(invalid_parameter, c.call(bad, B, e.handle(), 1));
      EXPECT_EQ(invalid_parameter, c.call(A, bad, e.handle(), 1));
    }
    for (const auto bad : {lumra_f32_matrix{}, no_e.handle(), small_e.handle()})
      EXPECT_EQ(invalid_parameter, c.call(A, B, bad, 1));
    for (const std::int32_t mode : {0, 4, -1, 1 << 20}) EXPECT_EQ(invalid_parameter, c.call(A, B, e.handle(), mode));
    EXPECT_EQ(7, e.block()->elements[0]);
    // Products are taken in 32 bits: 2^32 elements are none.
    for (const auto &[rows, columns, code] : {std::tuple{0, 5, 0},
                                              {-1, 5, invalid_parameter},
                                              {-2, -3, invalid_parameter},
                                              {65536, 65536, 0},
                                              {65536, 32768, invalid_parameter}}) {
      cf32_matrix x(1, 1), y(1, 1);
      f32_matrix out(1, 1);
      x.block()->rows = y.block()->rows = out.block()->rows = rows;
      x.block()->columns = y.block()->columns = out.block()->columns = columns;
      EXPECT_EQ(code, c.call(x.handle(), y.handle(), out.handle(), 2)) << rows << " x " << columns;
    }
  }
}

TEST(ErrorVector, ScalesInPlace) {
  for (const std::size_t n : {0U, 1U, 3U, 4U, 5U, 17U}) {
    tests::cf32_array data(n);
    for (std::size_t i = 0; i < n; ++i) data.elements()[i] = {static_cast<float>(i) + 0.1F, -3};
    EXPECT_EQ(0, qsLumraAlgo_scale_cf(data.elements().data(), n, 0.3F));
    for (std::size_t i = 0; i < n; ++i) {
      EXPECT_EQ((static_cast<float>(i) + 0.1F) * 0.3F, data.elements()[i].re);
      EXPECT_EQ(-3 * 0.3F, data.elements()[i].im);
    }
  }
  EXPECT_EQ(0, qsLumraAlgo_scale_cf(nullptr, 0, 2));
  EXPECT_EQ(-1, qsLumraAlgo_scale_cf(nullptr, 1, 2));
}

}  // namespace
