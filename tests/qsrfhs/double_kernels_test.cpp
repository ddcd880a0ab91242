// Windows, weights, conversions and recursions in double precision: all exact builds give the same bits.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <vector>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "support/guarded.hpp"
#include "support/signals.hpp"

namespace {

using namespace qsrfhs::kernels;

/// Records of n samples, which the window weighs from both ends.
template <class Real, std::size_t parts, class Kernel>
void expect_window(const build &b, Kernel kernel_table::*kernel, std::size_t terms, std::size_t n) {
  const auto polynomial = tests::noise_of<double>(7, 1), angles = tests::noise_of<double>(1024, 2);
  const auto x = tests::noise_of<Real>(parts * n, 3), y = tests::noise_of<Real>(parts * n, 4);
  for (const kernel_table *table : {b.exact, b.fused}) {
    const tests::guarded rising(x, tests::edge::back), falling(y, tests::edge::front);
    (table->*kernel)({angles.data(), angles.data() + 512, 0.8, -0.6}, polynomial.data(), terms, rising.as<Real>(),
                     falling.as<Real>(), n);
    for (std::size_t k = 0; k < parts * n; ++k) {
      const std::size_t at = k / parts, back = parts * (n - 1 - at) + k % parts;
      const double sine = -0.6 * angles[at] + 0.8 * angles[512 + at], u = sine * sine;
      double w = polynomial[terms - 1];
      for (std::size_t j = terms - 1; j-- > 0;) w = w * u + polynomial[j];
      ASSERT_EQ(x[k] * static_cast<Real>(w), rising.as<Real>()[k]) << b.name << ' ' << terms << ' ' << n;
      ASSERT_EQ(y[back] * static_cast<Real>(w), falling.as<Real>()[back]) << b.name << ' ' << terms << ' ' << n;
    }
  }
}

TEST(WindowKernels, FollowTheirDefinition) {
  for (const build &b : builds()) {
    for (const std::size_t terms : {2U, 3U, 4U, 5U, 7U})
      for (const std::size_t n : {0U, 1U, 7U, 8U, 63U, 64U, 65U, 130U, 512U}) {
        expect_window<float, 1>(b, &kernel_table::cosine_window, terms, n);
        expect_window<double, 1>(b, &kernel_table::cosine_window_double, terms, n);
        expect_window<float, 2>(b, &kernel_table::complex_cosine_window, terms, n);
        expect_window<double, 2>(b, &kernel_table::complex_cosine_window_double, terms, n);
      }
    const auto x = tests::noise_of<double>(80, 2);
    for (std::size_t n = 0; n < 40; ++n) {
      const tests::guarded out(n * sizeof(double), tests::edge::back);
      b.exact->weigh_double(x.data(), x.data() + 40, out.as<double>(), n);
      for (std::size_t k = 0; k < n; ++k) EXPECT_EQ(x[k] * x[40 + k], out.as<double>()[k]) << b.name;
    }
  }
}

TEST(DoubleKernels, WidenAndNarrow) {
  const auto x = tests::noise_of<float>(40, 3);
  for (const build &b : builds()) {
    for (std::size_t n = 0; n < 40; ++n) {
      const tests::guarded given(std::vector<float>(x.end() - static_cast<std::ptrdiff_t>(n), x.end()),
                                 tests::edge::back);
      const tests::guarded wide(8 * n, tests::edge::back), back(4 * n, tests::edge::back);
      b.exact->widen(given.as<float>(), wide.as<double>(), n);
      b.exact->narrow(wide.as<double>(), back.as<float>(), n);
      for (std::size_t k = 0; k < n; ++k) {
        EXPECT_EQ(double{given.as<float>()[k]}, wide.as<double>()[k]) << b.name;
        EXPECT_EQ(given.as<float>()[k], back.as<float>()[k]) << b.name;
      }
    }
  }
}

TEST(DoubleKernels, FindWhatIsNotFinite) {
  for (const build &b : builds())
    for (std::size_t n = 1; n < 70; ++n) {
      std::vector<double> x(n, 1e308);
      EXPECT_TRUE(b.exact->is_finite(x.data(), n)) << b.name;
      x[n * 7 / 11] = n % 2 ? -INFINITY : NAN;
      EXPECT_FALSE(b.exact->is_finite(x.data(), n)) << b.name << ' ' << n;
    }
}

// Five blocks and a part of one through a stable recursion of each order, beside the same sums in long double. Complex
// samples go through it part by part, and a stream that is cut between blocks gives the same bits.
TEST(DoubleKernels, RecurByBlocks) {
  constexpr std::size_t n = 43, room = 48;
  for (const std::size_t order : {1U, 2U, 3U, 4U, 5U, 8U, 9U, 16U}) {
    const std::size_t even = (order + 1) / 2 * 2, width = block_recursion::width_of(order, 1);
    std::vector<double> shares = tests::noise_of<double>(64, 4), responses(8 * even), gathering(8 * width),
                        transition(even * width), start(width);
    for (std::size_t i = 0; i < 8; ++i) std::fill_n(&shares[8 * i], i, 0.0);
    std::copy_n(tests::noise_of<double>(8 * order, 5).begin(), 8 * order, responses.begin());
    const auto noise = tests::noise_of<double>((8 + order) * order + order, 6);
    for (std::size_t j = 0; j < order; ++j) {
      start[j] = noise[j];
      for (std::size_t i = 0; i < 8; ++i) gathering[width * i + j] = noise[order * (i + 1) + j];
      for (std::size_t i = 0; i < order; ++i)
        transition[width * i + j] = noise[order * (i + 9) + j] / static_cast<double>(order);
    }
    auto x = tests::noise_of<double>(room, 7), other = tests::noise_of<double>(room, 8);
    for (std::vector<double> *const of : {&x, &other}) std::fill(of->begin() + n, of->end(), 0.0);

    std::vector<double> expected;
    std::vector<long double> state(start.begin(), start.end());
    for (std::size_t k = 0; k < n; k += 8) {
      std::vector<long double> next(width);
      for (std::size_t l = 0; l < 8; ++l) {
        long double y = 0;
        for (std::size_t i = 0; i < 8; ++i) y += static_cast<long double>(x[k + i]) * shares[8 * i + l];
        for (std::size_t j = 0; j < order; ++j) y += state[j] * responses[8 * j + l];
        if (k + l < n) expected.push_back(static_cast<double>(y));
      }
      for (std::size_t j = 0; j < order; ++j) {
        for (std::size_t i = 0; i < 8; ++i) next[j] += static_cast<long double>(x[k + i]) * gathering[width * i + j];
        for (std::size_t i = 0; i < order; ++i) next[j] += state[i] * transition[width * i + j];
      }
      if (k + 8 <= n) state = next;
    }
    expected.insert(expected.end(), state.begin(), state.end());

    const auto outputs = [&](const kernel_table &table, std::vector<double> samples, std::size_t cut) {
      const tests::guarded data(samples, tests::edge::back), kept(start, tests::edge::back);
      const block_recursion plan{order, shares.data(), responses.data(), gathering.data(), transition.data()};
      if (cut > 0) table.recursion(plan, cut, data.as<double>(), kept.as<double>());
      table.recursion(plan, n - cut, data.as<double>() + cut, kept.as<double>());
      std::vector<double> result(data.as<double>(), data.as<double>() + n);
      result.insert(result.end(), kept.as<double>(), kept.as<double>() + width);
      return result;
    };
    const auto twice = [](const std::vector<double> &a, const std::vector<double> &b, std::size_t size) {
      std::vector<double> pairs(size);
      for (std::size_t k = 0; k < a.size(); ++k) {
        pairs[2 * k] = a[k];
        pairs[2 * k + 1] = b[k];
      }
      return pairs;
    };
    const auto rows_twice = [&](const std::vector<double> &rows, std::size_t of, std::size_t to) {
      std::vector<double> all;
      for (std::size_t k = 0; k < rows.size(); k += of) {
        const std::vector<double> values(&rows[k], &rows[k] + std::min(of, to / 2));
        const std::vector<double> pairs = twice(values, values, to);
        all.insert(all.end(), pairs.begin(), pairs.end());
      }
      return all;
    };
    const std::size_t both = block_recursion::width_of(order, 2);
    const auto complex_shares = rows_twice(shares, 8, 16), complex_responses = rows_twice(responses, 8, 16),
               complex_gathering = rows_twice(gathering, width, both),
               complex_transition = rows_twice(transition, width, both);

    std::vector<double> fused;
    for (const build &b : builds()) {
      for (const kernel_table *table : {b.exact, b.fused}) {
        const auto got = outputs(*table, x, 0), of_other = outputs(*table, other, 0);
        if (table == b.exact)
          EXPECT_EQ(outputs(baseline_kernels, x, 0), got) << b.name;
        else if (fused.empty())
          fused = got;
        else
          EXPECT_EQ(fused, got) << b.name;
        for (std::size_t k = 0; k < expected.size(); ++k)
          EXPECT_NEAR(expected[k], got[k], 1e-13 * std::max(1.0, std::abs(expected[k]))) << order << ' ' << k;
        EXPECT_EQ(got, outputs(*table, x, 8)) << b.name << ' ' << order;

        const tests::guarded data(twice(x, other, 2 * room), tests::edge::back),
            kept(rows_twice(start, width, both), tests::edge::back);
        const block_recursion plan{order, complex_shares.data(), complex_responses.data(), complex_gathering.data(),
                                   complex_transition.data()};
        table->complex_recursion(plan, n, data.as<double>(), kept.as<double>());
        for (std::size_t k = 0; k < n + order; ++k) {
          const double *const pair = k < n ? data.as<double>() + 2 * k : kept.as<double>() + 2 * (k - n);
          EXPECT_EQ(got[k], pair[0]) << b.name << ' ' << order;
          EXPECT_EQ(of_other[k], pair[1]) << b.name << ' ' << order;
        }
      }
    }
  }
}

}  // namespace
