// What callers of the vector utilities meet: codes, sizing, refusals, closed-form results. SPDX-License-Identifier: MIT
#include <lumra/core_services.h>
#include <lumra/vector_utilities.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <functional>
#include <limits>
#include <vector>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "support/recorded.hpp"
#include "support/test_array.hpp"

bool operator==(const lumra_cf32 &a, const lumra_cf32 &b) {
  return a.re == b.re && a.im == b.im;
}

namespace {

using tests::cf32_array;
using tests::f32_array;
using tests::fake_host;

constexpr float inf = std::numeric_limits<float>::infinity();

TEST(VectorUtilities, RefuseInOrderAndTouchNothing) {
  const lumra_cf32 v{2, 0};
  cf32_array x{{1, 2}, {3, 4}}, short_y{{1, 1}}, y{{1, 1}, {1, 1}}, out{{7, 7}}, no_block;
  f32_array real_out{7.F};
  float rms = 7, peak = 7;
  const auto X = x.handle(), Y = y.handle(), none = no_block.handle();
  struct refusal {
    std::int32_t code;
    std::function<std::int32_t()> call;
  };
  const refusal refusals[] = {
      {-83951665, [&] { return qsRFHS_complex_division_array_by_array(nullptr, nullptr, nullptr); }},
      {-83951665, [&] { return qsRFHS_complex_division_array_by_array(none, Y, out.address()); }},
      {-83951668, [&] { return qsRFHS_complex_division_array_by_array(X, nullptr, nullptr); }},
      {-83951668, [&] { return qsRFHS_complex_division_array_by_array(X, none, out.address()); }},
      {-83951671, [&] { return qsRFHS_complex_division_array_by_array(X, short_y, nullptr); }},
      {-83951676, [&] { return qsRFHS_complex_division_array_by_array(X, short_y, out.address()); }},
      {-83951703, [&] { return qsRFHS_complex_division_assignment_array_by_array(nullptr, nullptr); }},
      {-83951703, [&] { return qsRFHS_complex_division_assignment_array_by_array(none, Y); }},
      {-83951706, [&] { return qsRFHS_complex_division_assignment_array_by_array(X, nullptr); }},
      {-83951706, [&] { return qsRFHS_complex_division_assignment_array_by_array(X, none); }},
      {-83951711, [&] { return qsRFHS_complex_division_assignment_array_by_array(X, short_y); }},
      {-83951730, [&] { return qsRFHS_complex_division_array_by_value(none, nullptr, nullptr); }},
      {-83951733, [&] { return qsRFHS_complex_division_array_by_value(X, nullptr, nullptr); }},
      {-83951736, [&] { return qsRFHS_complex_division_array_by_value(X, &v, nullptr); }},
      {-83951766, [&] { return qsRFHS_complex_division_assignment_array_by_value(nullptr, nullptr); }},
      {-83951769, [&] { return qsRFHS_complex_division_assignment_array_by_value(X, nullptr); }},
      {-83951791, [&] { return qsRFHS_complex_magnitude(none, nullptr); }},
      {-83951794, [&] { return qsRFHS_complex_magnitude(X, nullptr); }},
      {-83951822, [&] { return qsRFHS_complex_magnitude_squared(nullptr, nullptr); }},
      {-83951825, [&] { return qsRFHS_complex_magnitude_squared(X, nullptr); }},
      // Not recorded.
      {-1, [&] { return qsUtilHS_aLog2Plusb_SGL(real_out, nullptr, 1, 0); }},
      {-1, [&] { return qsUtilHS_aLog2Plusb_IQ(X, nullptr, 1, 0); }},
      {-1, [&] { return qsUtilHS_RMS_IQ_with_peak_calc(nullptr, &rms, &peak); }},
      {-1, [&] { return qsUtilHS_RMS_IQ_with_peak_calc(none, &rms, &peak); }},
      {-1, [&] { return qsUtilHS_RMS_IQ_with_peak_calc(X, nullptr, &peak); }},
      {-1, [&] { return qsUtilHS_RMS_IQ_with_peak_calc(X, &rms, nullptr); }},
      {-380127, [&] { return qsUtilHS_LookupTable(real_out, X, nullptr, nullptr, 0, 1); }},
      {-380127, [&] { return qsUtilHS_LookupTable(real_out, X, out.address(), none, 0, 1); }},
      {-380127, [&] { return qsUtilHS_LookupTable(real_out, X, out.address(), cf32_array(0), 0, 1); }},
      {-380127, [&] { return qsUtilHS_LookupTable(real_out, X, nullptr, Y, 0, -0.0F); }},
      {-1, [&] { return qsUtilHS_LookupTable(real_out, X, nullptr, Y, 0, 1); }},
  };
  const tests::recorded list;
  std::vector<std::int32_t> expected;
  for (const refusal &r : refusals) {
    EXPECT_EQ(r.code, r.call());
    if (r.code < -380127) expected.push_back(r.code);
  }
  EXPECT_EQ(expected, list.codes());

  EXPECT_EQ((std::vector<lumra_cf32>{{1, 2}, {3, 4}}), x.copy());
  EXPECT_EQ((std::vector<lumra_cf32>{{7, 7}}), out.copy());
  EXPECT_EQ(7, real_out.elements()[0]);
  EXPECT_EQ(7, rms);
  EXPECT_EQ(7, peak);
}

TEST(VectorUtilities, DivideAndMeasure) {
  cf32_array x{{1, 0}, {0, 0}, {3, -2}}, y{{0, 0}, {0, 0}, {0, 1}, {9, 9}}, quotient{{}, {}, {}};
  ASSERT_EQ(0, qsRFHS_complex_division_array_by_array(x, y, quotient.address()));
  for (int i = 0; i < 2; ++i) {  // infinity times zero
    EXPECT_TRUE(std::isnan(quotient.elements()[0].im));
    EXPECT_TRUE(std::isnan(quotient.elements()[1].re));
  }
  EXPECT_EQ((lumra_cf32{-2, -3}), quotient.elements()[2]);
  const lumra_cf32 j{0, 1};
  ASSERT_EQ(0, qsRFHS_complex_division_assignment_array_by_value(x, &j));
  EXPECT_EQ((lumra_cf32{-2, -3}), x.elements()[2]);
  ASSERT_EQ(0, qsRFHS_complex_division_array_by_value(x, &x.elements()[2], x.address()));
  EXPECT_EQ((lumra_cf32{1, 0}), x.elements()[2]);
  ASSERT_EQ(0, qsRFHS_complex_division_assignment_array_by_array(y, y));
  EXPECT_EQ((lumra_cf32{1, 0}), y.elements()[3]);

  cf32_array z{{3, 4}, {0, -2}, {2e19F, 0}};
  f32_array out{0, 0, 0};
  ASSERT_EQ(0, qsRFHS_complex_magnitude(z, out.address()));
  EXPECT_EQ((std::vector<float>{5, 2, inf}), out.copy());
  ASSERT_EQ(0, qsRFHS_complex_magnitude_squared(z, out.address()));
  EXPECT_EQ((std::vector<float>{25, 4, inf}), out.copy());
}

TEST(VectorUtilities, Logarithms) {
  f32_array x{1, 2, 0.5F, 3, 1000, 0, -0.0F, inf, -1, std::nanf("")};
  f32_array out(x.elements().size());
  ASSERT_EQ(0, qsUtilHS_aLog2Plusb_SGL(x, out.address(), 1, 0));
  ASSERT_EQ(0, qsRFHS_log2_scaled_SGL(x, 1, 0));
  constexpr float expected[] = {3.0517578e-5F, 1.0000305F,  -0.9999695F, 1.5849533F,
                                9.965790F,     -126.99997F, -126.99997F};
  for (std::size_t i = 0; i < std::size(expected); ++i) {
    EXPECT_FLOAT_EQ(expected[i], x.elements()[i]);
    EXPECT_FLOAT_EQ(expected[i] < -100 ? -inf : expected[i], out.elements()[i]);
  }
  for (const auto &values : {x.copy(), out.copy()}) {
    EXPECT_NEAR(128, values[7], 1e-3);
    EXPECT_TRUE(std::isnan(values[8]) && std::isnan(values[9]));
  }
  cf32_array z{{0, 0}, {1, 1}, {std::nanf(""), 0}, {0, -inf}};
  ASSERT_EQ(0, qsUtilHS_aLog2Plusb_IQ(z, out.address(), 10, 5));
  ASSERT_EQ(4U, out.elements().size());
  EXPECT_FLOAT_EQ(-1264.9997F, out.elements()[0]);
  EXPECT_FLOAT_EQ(15.000305F, out.elements()[1]);
  EXPECT_NEAR(1290.85, out.elements()[2], 0.01);
  EXPECT_NEAR(1285, out.elements()[3], 0.01);
}

TEST(VectorUtilities, Levels) {
  float rms = 0, peak = 0;
  cf32_array one{{3, 4}}, two{{1, 0}, {0, 0}}, none(0), no_block;
  EXPECT_EQ(0, qsUtilHS_RMS_IQ_with_peak_calc(one, &rms, &peak));
  EXPECT_EQ(5, rms);
  EXPECT_EQ(5, peak);
  EXPECT_EQ(0, qsUtilHS_RMS_IQ_with_peak_calc(two, &rms, &peak));
  EXPECT_EQ(std::sqrt(0.5F), rms);
  EXPECT_EQ(1, peak);
  EXPECT_EQ(0, qsUtilHS_RMS_IQ_with_peak_calc(none, &rms, &peak));
  EXPECT_TRUE(std::isnan(rms) && std::isnan(peak));
  EXPECT_EQ(0, qsUtilHS_RMS_IQ(two, &rms));
  EXPECT_EQ(std::sqrt(0.5F), rms);
  for (const lumra_cf32_array empty : {none.handle(), no_block.handle(), lumra_cf32_array{}}) {
    rms = 0;
    EXPECT_EQ(0, qsUtilHS_RMS_IQ(empty, &rms));
    EXPECT_TRUE(std::isnan(rms));
  }
  EXPECT_EQ(0, qsUtilHS_RMS_IQ(two, nullptr));
}

/// The functions that size `out` for the elements of x.
struct sizing {
  const char *name;
  std::int32_t type;
  std::size_t width;
  std::function<std::int32_t(lumra_cf32_array x, void *out)> call;
};

std::vector<sizing> sizings() {
  static const lumra_cf32 v{1, 0};
  static f32_array keys(5), reals(5);
  static cf32_array table{{1, 0}, {0, 0}};
  const auto complex = [](void *out) { return static_cast<lumra_cf32_array *>(out); };
  const auto real = [](void *out) { return static_cast<lumra_f32_array *>(out); };
  return {{"array by array", 12, 8,
           [=](auto x, auto o) { return qsRFHS_complex_division_array_by_array(x, x, complex(o)); }},
          {"array by value", 12, 8,
           [=](auto x, auto o) { return qsRFHS_complex_division_array_by_value(x, &v, complex(o)); }},
          {"magnitude", 9, 4, [=](auto x, auto o) { return qsRFHS_complex_magnitude(x, real(o)); }},
          {"magnitude squared", 9, 4, [=](auto x, auto o) { return qsRFHS_complex_magnitude_squared(x, real(o)); }},
          {"log of power", 9, 4, [=](auto x, auto o) { return qsUtilHS_aLog2Plusb_IQ(x, real(o), 1, 0); }},
          {"log", 9, 4,
           [=](auto x, auto o) {
             reals.block()->count = x ? (*x)->count : 0;
             return qsUtilHS_aLog2Plusb_SGL(reals, real(o), 1, 0);
           }},
          {"lookup", 12, 8, [=](auto x, auto o) {
             keys.block()->count = x ? (*x)->count : 0;
             return qsUtilHS_LookupTable(keys, x, complex(o), table, 0, 1);
           }}};
}

TEST(VectorUtilities, SizeTheirOutputs) {
  for (const sizing &s : sizings()) {
    SCOPED_TRACE(s.name);
    fake_host host(fake_host::unit::bytes);
    cf32_array x{{1, 0}, {1, 0}, {1, 0}, {1, 0}, {1, 0}};
    void **handle = nullptr;
    EXPECT_EQ(0, s.call(x, &handle));  // made by the host
    ASSERT_EQ(1U, host.calls.size());
    EXPECT_EQ(s.type, host.calls[0].type);
    EXPECT_EQ(1, host.calls[0].dimensions);
    EXPECT_EQ(5 * s.width, host.calls[0].size);
    const auto count = [&]() -> std::int32_t & { return *static_cast<std::int32_t *>(*handle); };
    EXPECT_EQ(5, count());
    const void *block = *handle;
    for (const std::int32_t n : {5, 3, 0, -4}) {  // shrinks in place
      x.block()->count = n;
      EXPECT_EQ(0, s.call(x, &handle));
      EXPECT_EQ(std::max(n, 0), count());
      EXPECT_EQ(block, *handle);
    }
    EXPECT_EQ(1U, host.calls.size());
    x.block()->count = 2;
    EXPECT_EQ(0, s.call(x, &handle));
    EXPECT_EQ(2U, host.calls.size());
    EXPECT_EQ(2, count());
    host.refuse_from = 2;  // the block of two elements ends where a sanitizer looks
    x.block()->count = 5;
    EXPECT_EQ(0, s.call(x, &handle));
    EXPECT_EQ(3U, host.calls.size());
    EXPECT_EQ(2, count());
    void **missing = nullptr;
    EXPECT_EQ(0, s.call(x, &missing));
    EXPECT_EQ(nullptr, missing);
    x.block()->count = 0;
    host.refuse_from = -1;
    EXPECT_EQ(0, s.call(x, &missing));
    EXPECT_EQ(0U, host.calls.back().size);
  }
}

TEST(VectorUtilities, AHostThatThrowsHasRefused) {
  cf32_array x{{3, 4}, {6, 8}};
  f32_array out{1};
  qsHost_SetArrayResize([](std::int32_t, std::int32_t, void *, std::uint64_t) -> std::int32_t { throw 1; });
  EXPECT_EQ(0, qsRFHS_complex_magnitude(x, out.address()));
  EXPECT_EQ(0, qsRFHS_ApplyPolynomial(out, f32_array{1.F}, f32_array(0)));
  qsHost_SetArrayResize(nullptr);
  EXPECT_EQ((std::vector<float>{5}), out.copy());
}

TEST(Polynomial, EvaluatesAndSizes) {
  fake_host host(fake_host::unit::bytes);
  f32_array x{2, 3, 0}, c{1, 2, 3}, out{9, 9, 9, 9}, empty(0), no_block;
  ASSERT_EQ(0, qsRFHS_ApplyPolynomial(x, c, out));
  EXPECT_EQ((std::vector<float>{17, 34, 1}), out.copy());
  ASSERT_EQ(1U, host.calls.size());  // a larger output is resized, too
  EXPECT_EQ(9, host.calls[0].type);
  EXPECT_EQ(12U, host.calls[0].size);
  ASSERT_EQ(0, qsRFHS_ApplyPolynomial(x, c, out));
  EXPECT_EQ(1U, host.calls.size());

  for (const lumra_f32_array nothing : {empty.handle(), no_block.handle(), lumra_f32_array{}}) {
    f32_array emptied{5.F};
    ASSERT_EQ(0, qsRFHS_ApplyPolynomial(x, nothing, emptied));
    EXPECT_EQ(0U, emptied.elements().size());
    EXPECT_EQ(0U, host.calls.back().size);
    const std::size_t calls = host.calls.size();
    ASSERT_EQ(0, qsRFHS_ApplyPolynomial(nothing, c, emptied));
    EXPECT_EQ(calls, host.calls.size());  // empty already
  }

  cf32_array cc{{1, 0}, {0, 1}}, complex_out;
  float seconds = -1;
  ASSERT_EQ(0, qsRFHS_ApplyPolynomialCplx(x, cc, complex_out, &seconds));
  EXPECT_EQ((std::vector<lumra_cf32>{{1, 2}, {1, 3}, {1, 0}}), complex_out.copy());
  EXPECT_EQ(12, host.calls.back().type);
  EXPECT_EQ(24U, host.calls.back().size);
  EXPECT_GE(seconds, 0);
  EXPECT_LT(seconds, 5);
  seconds = -1;
  ASSERT_EQ(0, qsRFHS_ApplyPolynomialCplx(empty, cc, complex_out, &seconds));
  EXPECT_EQ(-1, seconds);
  EXPECT_EQ(0U, complex_out.elements().size());
  EXPECT_EQ(0, qsRFHS_ApplyPolynomialCplx(x, cc, nullptr, nullptr));
}

TEST(Polynomial, OutputsThatAreInputs) {
  fake_host host(fake_host::unit::bytes);
  f32_array x{2, 3, 0, 1}, c{1, 2, 3};
  ASSERT_EQ(0, qsRFHS_ApplyPolynomial(x, c, c));
  EXPECT_EQ((std::vector<float>{17, 34, 1, 6}), c.copy());
  ASSERT_EQ(0, qsRFHS_ApplyPolynomial(x, x, x));
  EXPECT_EQ((std::vector<float>{2 + 6 + 0 + 8, 2 + 9 + 0 + 27, 2, 6}), x.copy());
  // Real values have no room for complex ones: nothing is written.
  const auto as_complex = reinterpret_cast<lumra_cf32_array>(x.handle());
  ASSERT_EQ(0, qsRFHS_ApplyPolynomialCplx(x, cf32_array{{1, 1}}.handle(), as_complex, nullptr));
  EXPECT_EQ(2 + 6 + 0 + 8, x.elements()[0]);
}

TEST(Polynomial, LeavesWhatItsBuildDoesNotReach) {
  f32_array x(40), c(33), out(40);
  std::fill(c.elements().begin(), c.elements().end(), 1.F);
  std::fill(out.elements().begin(), out.elements().end(), 7.F);
  ASSERT_EQ(0, qsRFHS_ApplyPolynomial(x, c, out));
  const auto evaluated = std::count(out.elements().begin(), out.elements().end(), 1.F);
  EXPECT_EQ(40 - evaluated, std::count(out.elements().begin() + evaluated, out.elements().end(), 7.F));
  EXPECT_GT(evaluated, 0);
  EXPECT_LT(evaluated, 40);
  cf32_array many(33), complex_out(40);
  std::fill(many.elements().begin(), many.elements().end(), lumra_cf32{1, 2});
  ASSERT_EQ(0, qsRFHS_ApplyPolynomialCplx(x, many, complex_out, nullptr));
  for (const lumra_cf32 &value : complex_out.elements()) EXPECT_EQ((lumra_cf32{1, 2}), value);
}

TEST(Polynomial, ARefusedResizeKeepsTheCountAndWritesNoFurther) {
  fake_host host(fake_host::unit::bytes);
  host.refuse_from = 0;
  f32_array x(40), few{1.F, 1.F}, many(17), out(20), none;
  many.elements()[0] = 3;
  ASSERT_EQ(0, qsRFHS_ApplyPolynomial(x, few, out));
  EXPECT_EQ(20, std::count(out.elements().begin(), out.elements().end(), 1.F));
  EXPECT_EQ(20U, out.elements().size());
  ASSERT_EQ(0, qsRFHS_ApplyPolynomial(x, few, none));
  EXPECT_EQ(nullptr, none.block());
  // What is reached depends on the count asked for, not on the room.
  ASSERT_EQ(0, qsRFHS_ApplyPolynomial(x, many, out));
  EXPECT_EQ(&qsrfhs::kernels::exact() != &qsrfhs::kernels::baseline_kernels ? 20 : 8,
            std::count(out.elements().begin(), out.elements().end(), 3.F));
}

}  // namespace
