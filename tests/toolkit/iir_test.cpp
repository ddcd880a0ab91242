// SPDX-License-Identifier: MIT
#include <algorithm>

#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

/// A filter with its arrays.
template <class E>
struct filter_of {
  using F = toolkit::magnitude_of<E>;

  array_of<F> a, b;
  array_of<E> forward_state = array_of<E>(0), reverse_state = array_of<E>(0), saved = array_of<E>(0);
  array_of<F> scratch = array_of<F>(0), more_scratch = array_of<F>(0);

  filter_of(const std::vector<double> &forward, const std::vector<double> &reverse)
      : a(filled<F>({reverse.begin(), reverse.end()})), b(filled<F>({forward.begin(), forward.end()})) {}

  /// The result of the samples first .. first + count - 1.
  std::vector<toolkit::value_of<E>> run(const std::vector<toolkit::value_of<E>> &record, std::size_t first = 0,
                                        std::size_t count = ~std::size_t{0}, int reset = 0) {
    const auto block = std::span(record).subspan(first, std::min(count, record.size() - first));
    array_of<E> data = filled<E>({block.begin(), block.end()});
    EXPECT_EQ(0, filter<E>(data, a, b, forward_state, reverse_state, reset, scratch, more_scratch, saved));
    EXPECT_EQ(0, scratch.block()->count + more_scratch.block()->count + saved.block()->count);
    return {values<E>(data).begin(), values<E>(data).end()};
  }
  std::vector<toolkit::value_of<E>> in_blocks(const std::vector<toolkit::value_of<E>> &record, std::size_t block) {
    std::vector<toolkit::value_of<E>> all;
    for (std::size_t first = 0; first < record.size(); first += block) {
      const auto part = run(record, first, block);
      all.insert(all.end(), part.begin(), part.end());
    }
    return all;
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

template <class E>
using Iir = toolkit_test<E>;
TYPED_TEST_SUITE(Iir, all_letters);

TYPED_TEST(Iir, AgreesWithTheDifferenceEquationHoweverTheStreamIsCut) {
  using E = TypeParam;
  for (const design &d : designs) {
    for (const std::size_t n : {1U, 3U, 50U, 300U}) {
      if (d.growth == 1e3 && n > 50) continue;  // beyond single precision
      SCOPED_TRACE(testing::Message() << d.name << ", " << n << " samples");
      const auto record = noise<E>(n);
      filter_of<E> whole(d.b, d.a);
      const auto got = whole.run(record);
      EXPECT_LT(error_in_epsilons<E>(got, difference_equation(wide(record), d.b, d.a)), 8 * d.growth);
      for (const std::size_t block : {1U, 2U, 7U, 64U}) {
        filter_of<E> cut(d.b, d.a);
        EXPECT_EQ(got, cut.in_blocks(record, block)) << "block " << block;
        // Newest first, in both states.
        EXPECT_TRUE(same_bytes(cut.reverse_state.elements(), whole.reverse_state.elements()));
        for (std::size_t j = 0; j < cut.forward_state.elements().size(); ++j)
          EXPECT_EQ(j < n ? record[n - 1 - j] : toolkit::value_of<E>{}, values<E>(cut.forward_state)[j]);
      }
    }
  }
}

TYPED_TEST(Iir, SilenceEndsInTheSmallestNumbersAndAgreesHoweverCut) {
  using E = TypeParam;
  using real = toolkit::real_of<E>;
  constexpr double smallest = std::numeric_limits<real>::denorm_min();
  for (const double gain : {1.0, 2.0}) {
    const std::vector<double> b{gain}, a{gain, gain * -1.25, gain * 0.5};  // poles at 0.7
    const std::size_t n = 400;
    auto record = noise<E>(4);
    record.resize(n);
    for (auto &v : record) v *= static_cast<real>(1e4 * std::numeric_limits<real>::min());
    reference exact(n);  // in steps of the smallest number, which double precision cannot tell from 0 for itself
    for (std::size_t i = 0; i < n; ++i) exact[i] = std::complex<double>(record[i] / std::numeric_limits<real>::min());
    exact = difference_equation(exact, b, a);
    const auto got = filter_of<E>(b, a).run(record);
    for (std::size_t i = 0; i < n; ++i) {
      const auto d = std::complex<double>(got[i] / std::numeric_limits<real>::min()) - exact[i];
      EXPECT_LT(std::abs(d), 1e4 * 16 * std::numeric_limits<real>::epsilon()) << i;
    }
    EXPECT_LT(static_cast<double>(std::abs(got[n - 1])), 8 * smallest);
    for (const std::size_t block : {1U, 3U, 50U}) EXPECT_EQ(got, filter_of<E>(b, a).in_blocks(record, block));
  }
}

TYPED_TEST(Iir, StatesStartAnewWhenTheyMust) {
  using E = TypeParam;
  const auto record = noise<E>(20);
  filter_of<E> f({1, 0.5}, {1, 0.25}), longer({1, 0.5, 0.25}, {1, 0.25});
  const auto first = f.run(record);
  EXPECT_NE(first, f.run(record));
  EXPECT_EQ(first, f.run(record, 0, record.size(), 1));
  std::swap(*f.forward_state.handle(), *longer.forward_state.handle());
  std::swap(*f.reverse_state.handle(), *longer.reverse_state.handle());
  EXPECT_EQ(filter_of<E>({1, 0.5, 0.25}, {1, 0.25}).run(record), longer.run(record));
}

}  // namespace
