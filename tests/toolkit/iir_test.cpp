// SPDX-License-Identifier: MIT
#include <algorithm>
#include <chrono>

#include "toolkit/families.hpp"
#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

template <class Data, class Coefficients>
struct letters {
  using data = Data;
  using coefficients = Coefficients;
};

/// A filter with its arrays.
template <class L>
struct filter {
  using E = typename L::data;
  using F = typename L::coefficients;

  array_of<F> a, b;
  array_of<E> forward_state = array_of<E>(std::size_t{0}), reverse_state = array_of<E>(std::size_t{0}),
              saved = array_of<E>(std::size_t{0});
  array_of<F> forward_scratch = array_of<F>(std::size_t{0}), reverse_scratch = array_of<F>(std::size_t{0});

  filter(const std::vector<double> &forward, const std::vector<double> &reverse)
      : a(filled<F>({reverse.begin(), reverse.end()})), b(filled<F>({forward.begin(), forward.end()})) {}

  std::int32_t run(array_of<E> &data, int reset = 0, bool with_scratch = true) {
    auto *const forward = with_scratch ? forward_scratch.handle() : nullptr;
    auto *const reverse = with_scratch ? reverse_scratch.handle() : nullptr;
    const auto call = [&](auto f, auto... scratch) {
      return f(data.handle(), a.handle(), b.handle(), forward_state.handle(), reverse_state.handle(), reset, scratch...,
               saved.handle());
    };
    if constexpr (std::is_same_v<E, toolkit::z>) return call(&qsRFPELTA_zdIIRDirectFilterH, forward);
    if constexpr (std::is_same_v<E, toolkit::c>) return call(&qsRFPELTA_csIIRDirectFilterH, forward, reverse);
    if constexpr (std::is_same_v<E, toolkit::d>) return call(&qsRFPELTA_ddIIRDirectFilterH, forward, reverse);
    if constexpr (std::is_same_v<E, toolkit::s>) return call(&qsRFPELTA_ssIIRDirectFilterH, forward, reverse);
  }
};

/// The difference equation, in double precision.
reference difference_equation(const reference &x, const std::vector<double> &b, const std::vector<double> &a) {
  reference y(x.size());
  for (std::size_t i = 0; i < x.size(); ++i) {
    for (std::size_t j = 0; j < b.size() && j <= i; ++j) y[i] += b[j] * x[i - j];
    for (std::size_t j = 1; j < a.size() && j <= i; ++j) y[i] -= a[j] * y[i - j];
    if (!a.empty()) y[i] /= a[0];
  }
  return y;
}

struct design {
  const char *name;
  std::vector<double> b, a;
  double growth;  // of rounding errors, by the filter's poles
};

// Coefficients that single precision holds, poles inside the unit circle unless said otherwise.
const std::vector<design> designs = {
    {"one coefficient", {0.75}, {}, 1},
    {"gain alone", {1}, {2}, 1},
    {"averages", {0.25, 0.5, 0.25}, {}, 1},
    {"long sum", std::vector<double>(37, 0.125), {}, 4},
    {"one pole", {1}, {1, -0.5}, 2},
    {"scaled one pole", {0.5, 0.5}, {4, -2}, 2},
    {"butterworth 4", {0.0625, 0.25, 0.375, 0.25, 0.0625}, {1, -0.78125, 0.6796875, -0.18359375, 0.0302734375}, 8},
    {"elliptic-like 3, scaled", {0.25, 0.125, 0.125, 0.25}, {2, -2.25, 1.625, -0.375}, 30},
    {"more b than a", {1, -1, 0.5, 0.25, -0.125, 0.5, 0.75}, {1, 0.25, -0.5}, 4},
    {"more a than b", {1}, {1, 0, 0, 0, 0, 0, 0.5}, 4},
    {"twelve", {1}, {1, 0.25, 0.125, 0, -0.125, 0, 0.0625, 0, 0, 0.25, 0, -0.125, 0.125}, 10},
    {"twenty",
     {1, 0.5},
     {1, 0.25, 0.125, 0, -0.125, 0, 0.0625, 0, 0, 0.25, 0, 0, 0, 0.125, 0, 0, 0.0625, 0, 0, 0, 0.25},
     30},
    {"unstable", {1}, {1, -2.5, 1}, 1e3},
};

template <class L>
class Iir : public testing::Test {
 protected:
  fake_host host{fake_host::unit::elements};
};
using all_filters = testing::Types<letters<toolkit::s, toolkit::s>, letters<toolkit::d, toolkit::d>,
                                   letters<toolkit::c, toolkit::s>, letters<toolkit::z, toolkit::d>>;
TYPED_TEST_SUITE(Iir, all_filters);

TYPED_TEST(Iir, AgreesWithTheDifferenceEquationHoweverTheStreamIsCut) {
  using E = typename TypeParam::data;
  for (const design &d : designs) {
    for (const std::size_t n : {1U, 3U, 50U, 300U}) {
      if (d.growth == 1e3 && n > 50) continue;  // beyond single precision
      SCOPED_TRACE(testing::Message() << d.name << ", " << n << " samples");
      const auto record = noise<E>(n);
      filter<TypeParam> whole(d.b, d.a);
      array_of<E> data = filled<E>(record);
      ASSERT_EQ(0, whole.run(data));
      EXPECT_LT(error_in_epsilons<E>(values<E>(data), difference_equation(wide(record), d.b, d.a)), 8 * d.growth);
      EXPECT_EQ(
          0, whole.forward_scratch.block()->count + whole.reverse_scratch.block()->count + whole.saved.block()->count);
      for (const std::size_t block : {1U, 2U, 7U, 64U}) {
        filter<TypeParam> cut(d.b, d.a);
        for (std::size_t first = 0; first < n; first += block) {
          const auto begin = record.begin() + static_cast<std::ptrdiff_t>(first);
          const std::size_t count = std::min(block, n - first);
          array_of<E> part = filled<E>({begin, begin + static_cast<std::ptrdiff_t>(count)});
          ASSERT_EQ(0, cut.run(part));
          ASSERT_EQ(0,
                    std::memcmp(part.elements().data(), data.elements().data() + first, part.elements().size_bytes()))
              << "block " << block << " at " << first;
        }
        // Newest first, in both states.
        ASSERT_EQ(0, std::memcmp(cut.reverse_state.elements().data(), whole.reverse_state.elements().data(),
                                 cut.reverse_state.elements().size_bytes()));
        for (std::size_t j = 0; j < cut.forward_state.elements().size(); ++j)
          EXPECT_EQ(j < n ? record[n - 1 - j] : toolkit::value_of<E>{}, values<E>(cut.forward_state)[j]);
      }
    }
  }
}

TYPED_TEST(Iir, SilenceEndsInTheSmallestNumbersAndAgreesHoweverCut) {
  using E = typename TypeParam::data;
  using real = toolkit::real_of<E>;
  constexpr double smallest = std::numeric_limits<real>::denorm_min();
  for (const double gain : {1.0, 2.0}) {
    const std::vector<double> b{gain}, a{gain, gain * -1.25, gain * 0.5};  // poles at 0.7
    const std::size_t n = 400;
    std::vector<toolkit::value_of<E>> record(n);
    for (std::size_t i = 0; i < 4; ++i)
      record[i] = noise<E>(4)[i] * static_cast<real>(1e4 * std::numeric_limits<real>::min());
    reference exact(n);  // in steps of the smallest number, which double precision cannot tell from 0 for itself
    for (std::size_t i = 0; i < n; ++i) exact[i] = std::complex<double>(record[i] / std::numeric_limits<real>::min());
    exact = difference_equation(exact, b, a);
    filter<TypeParam> whole(b, a);
    array_of<E> data = filled<E>(record);
    ASSERT_EQ(0, whole.run(data));
    const auto got = values<E>(data);
    for (std::size_t i = 0; i < n; ++i) {
      const auto d = std::complex<double>(got[i] / std::numeric_limits<real>::min()) - exact[i];
      EXPECT_LT(std::abs(d), 1e4 * 16 * std::numeric_limits<real>::epsilon()) << i;
    }
    EXPECT_LT(static_cast<double>(std::abs(got[n - 1])), 8 * smallest);
    for (const std::size_t block : {1U, 3U, 50U}) {
      filter<TypeParam> cut(b, a);
      for (std::size_t first = 0; first < n; first += block) {
        const auto begin = record.begin() + static_cast<std::ptrdiff_t>(first);
        array_of<E> part = filled<E>({begin, begin + static_cast<std::ptrdiff_t>(std::min(block, n - first))});
        ASSERT_EQ(0, cut.run(part));
        ASSERT_EQ(0, std::memcmp(part.elements().data(), data.elements().data() + first, part.elements().size_bytes()));
      }
    }
  }
}

TYPED_TEST(Iir, StatesStartAnewWhenTheyMust) {
  using E = typename TypeParam::data;
  const auto record = noise<E>(20);
  const auto fresh = [&](const std::vector<double> &b, const std::vector<double> &a) {
    filter<TypeParam> f(b, a);
    array_of<E> data = filled<E>(record);
    EXPECT_EQ(0, f.run(data));
    return data.copy();
  };
  const auto bytes_equal = [](const auto &x, const auto &y) {
    return x.size() == y.size() && std::memcmp(x.data(), y.data(), x.size() * sizeof x[0]) == 0;
  };
  filter<TypeParam> f({1, 0.5}, {1, 0.25});
  array_of<E> first = filled<E>(record), again = filled<E>(record), reset = filled<E>(record),
              longer = filled<E>(record);
  ASSERT_EQ(0, f.run(first));
  ASSERT_EQ(0, f.run(again));
  EXPECT_FALSE(bytes_equal(again.copy(), first.copy()));
  ASSERT_EQ(0, f.run(reset, 1));
  EXPECT_TRUE(bytes_equal(reset.copy(), first.copy()));
  filter<TypeParam> changed({1, 0.5, 0.25}, {1, 0.25});
  std::swap(*f.forward_state.handle(), *changed.forward_state.handle());
  std::swap(*f.reverse_state.handle(), *changed.reverse_state.handle());
  ASSERT_EQ(0, changed.run(longer));
  EXPECT_TRUE(bytes_equal(longer.copy(), fresh({1, 0.5, 0.25}, {1, 0.25})));
}

TYPED_TEST(Iir, RefusesAndEmpties) {
  using E = typename TypeParam::data;
  const auto record = noise<E>(5);
  const auto expect = [&](std::int32_t code, filter<TypeParam> &f, bool with_scratch) {
    array_of<E> data = filled<E>(record);
    EXPECT_EQ(code, f.run(data, 0, with_scratch));
    if (code == 0) return;
    EXPECT_EQ(0U, data.elements().size() + f.forward_state.elements().size() + f.reverse_state.elements().size());
  };
  filter<TypeParam> reverse_alone({}, {1, 2}), nothing({}, {}), needs_both({1, 2}, {1, 2}), needs_reverse({1}, {1, 2}),
      plain({1}, {2});
  expect(-20008, reverse_alone, true);
  expect(0, nothing, false);
  expect(-20999, needs_both, false);
  expect(-20999, needs_reverse, false);
  expect(0, plain, false);
  array_of<E> none(std::size_t{0}), null_block;
  filter<TypeParam> kept({1, 2}, {1, 2});
  expect(0, kept, true);
  EXPECT_EQ(0, kept.run(none));
  EXPECT_EQ(0, kept.run(null_block));
  EXPECT_EQ(1U, kept.forward_state.elements().size());
  for (int n = 0;; ++n) {  // every resize fails
    SCOPED_TRACE(n);
    filter<TypeParam> f({1, 2, 3}, {1, 2, 3});
    array_of<E> data = filled<E>(record);
    this->host.calls.clear();
    this->host.refuse_from = n;
    this->host.refuse_until = n + 1;
    const std::int32_t code = f.run(data);
    this->host.refuse_from = -1;
    if (static_cast<int>(this->host.calls.size()) <= n) break;
    EXPECT_TRUE(code == -20001 || code == 0) << code;
    if (code == -20001) {
      EXPECT_EQ(0U, data.elements().size() + f.forward_state.elements().size() + f.reverse_state.elements().size());
    }
  }
}

}  // namespace
