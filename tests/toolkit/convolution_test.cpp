// SPDX-License-Identifier: MIT
#include "toolkit/convolution.hpp"

#include <algorithm>

#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

TEST(SmoothLength, IsTheNextOneWithSmallPrimes) {
  for (const auto &[least, want] :
       {std::pair{1, 1}, {2, 2}, {11, 12}, {13, 14}, {143, 144}, {121, 125}, {100099, 100352}})
    EXPECT_EQ(want, toolkit::smooth_length(least));
}

reference convolve(const reference &x, const reference &y) {
  reference out(x.size() + y.size() - 1);
  for (std::size_t i = 0; i < x.size(); ++i)
    for (std::size_t j = 0; j < y.size(); ++j) out[i + j] += x[i] * y[j];
  return out;
}

reference correlate(reference x, const reference &y, int normalisation = 0) {
  const std::size_t nx = x.size(), ny = y.size();
  std::reverse(x.begin(), x.end());
  for (auto &v : x) v = std::conj(v);
  reference out = convolve(x, y);
  for (std::size_t i = 0; i < out.size(); ++i) {
    const std::size_t products = std::min({i + 1, out.size() - i, nx, ny});
    if (normalisation != 0) out[i] /= static_cast<double>(normalisation == 1 ? products : std::max(nx, ny));
  }
  return out;
}

double rms(const reference &x) {
  double sum = 0;
  for (const auto &v : x) sum += std::norm(v);
  return std::sqrt(sum / static_cast<double>(x.size()));
}

double bound(int method, std::size_t nx, std::size_t ny) {
  return method == 1 ? transform_bound(nx + ny) : sum_bound(std::min(nx, ny));
}

// Both sides of 25 samples and of the block size, lengths whose sum is smooth and not, one sample.
constexpr std::pair<int, int> lengths[] = {{1, 1},  {1, 7}, {7, 1},    {24, 24}, {25, 3},
                                           {3, 25}, {6, 6}, {200, 31}, {31, 500}};

template <class E>
using Convolution = toolkit_test<E>;
TYPED_TEST_SUITE(Convolution, all_letters);

TYPED_TEST(Convolution, AgreesWithTheDefinition) {
  using E = TypeParam;
  for (const auto &[nx, ny] : lengths) {
    const auto x = noise<E>(static_cast<std::size_t>(nx), 1), y = noise<E>(static_cast<std::size_t>(ny), 2);
    const reference full = convolve(wide(x), wide(y));
    for (const int method : {0, 1}) {
      for (const int mode : {0, 1, 2}) {
        if (mode == 2 && nx < ny) continue;
        for (const int block : {0, 1, 16, 1000}) {
          SCOPED_TRACE(testing::Message() << nx << ", " << ny << ", method " << method << ", mode " << mode);
          array_of<E> ax = filled<E>(x), ay = filled<E>(y), out, scratch, room;
          ASSERT_EQ(0, family<E>::convolution(ax, ay, out, mode, method, block, scratch, room, &this->slot));
          const int first[] = {0, ny / 2, ny - 1}, count[] = {nx + ny - 1, nx, nx - ny + 1};
          const reference want(full.begin() + first[mode], full.begin() + first[mode] + count[mode]);
          // A transform spreads its error over all samples, also over those that are kept.
          const double growth = method == 1 ? std::max(1.0, rms(full) / rms(want)) : 1.0;
          EXPECT_LT(error_in_epsilons<E>(values<E>(out), want),
                    growth * bound(method, static_cast<std::size_t>(nx), static_cast<std::size_t>(ny)));
          EXPECT_TRUE(scratch.elements().empty() && room.elements().empty());
        }
      }
    }
  }
}

template <class Pair>
class Correlation : public Convolution<typename Pair::lags> {};
using pairs = testing::Types<correlation_pair<toolkit::s, toolkit::s>, correlation_pair<toolkit::d, toolkit::d>,
                             correlation_pair<toolkit::c, toolkit::c>, correlation_pair<toolkit::z, toolkit::z>,
                             correlation_pair<toolkit::s, toolkit::c>, correlation_pair<toolkit::c, toolkit::s>,
                             correlation_pair<toolkit::d, toolkit::z>, correlation_pair<toolkit::z, toolkit::d>>;
TYPED_TEST_SUITE(Correlation, pairs);

TYPED_TEST(Correlation, AgreesWithTheDefinition) {
  using Pair = TypeParam;
  using E = typename Pair::lags;
  for (const auto &[nx, ny] : lengths) {
    const auto x = noise<typename Pair::x>(static_cast<std::size_t>(nx), 1);
    const auto y = noise<typename Pair::y>(static_cast<std::size_t>(ny), 2);
    for (const int method : {0, 1}) {
      for (const int normalisation : {0, 1, 2}) {
        SCOPED_TRACE(testing::Message() << nx << ", " << ny << ", method " << method << ", n. " << normalisation);
        auto ax = filled<typename Pair::x>(x);
        auto ay = filled<typename Pair::y>(y);
        array_of<E> out, scratch, room;
        ASSERT_EQ(0, Pair::correlate(ax, ay, out, method, normalisation, 0, scratch, room, &this->slot));
        // Dividing makes the few-term tails, where the transform's error is the same, as large as the middle.
        const double growth = method == 1 && normalisation == 1 ? std::sqrt(std::min(nx, ny)) : 1.0;
        EXPECT_LT(error_in_epsilons<E>(values<E>(out), correlate(wide(x), wide(y), normalisation)),
                  growth * bound(method, static_cast<std::size_t>(nx), static_cast<std::size_t>(ny)));
        EXPECT_TRUE(scratch.elements().empty() && room.elements().empty());
      }
    }
  }
}

/// The matrix laid out in rows of `columns`, so that a one-dimensional correlation is the two-dimensional one.
template <class T>
reference spread(const std::vector<T> &m, int rows, int own, int columns) {
  reference out(static_cast<std::size_t>((rows - 1) * columns + own));
  for (int r = 0; r < rows; ++r)
    for (int k = 0; k < own; ++k)
      out[static_cast<std::size_t>(r * columns + k)] = m[static_cast<std::size_t>(r * own + k)];
  return out;
}

TYPED_TEST(Convolution, OfMatricesAgreesWithTheDefinition) {
  using E = TypeParam;
  struct shape {
    int rows, columns;
  };
  const std::pair<shape, shape> shapes[] = {{{1, 1}, {1, 1}}, {{1, 5}, {1, 3}},   {{5, 1}, {3, 1}},
                                            {{3, 4}, {2, 5}}, {{6, 30}, {9, 40}}, {{1, 9}, {12, 2}}};
  for (const auto &[a, b] : shapes) {
    const auto x = noise<E>(static_cast<std::size_t>(a.rows * a.columns), 1);
    const auto y = noise<E>(static_cast<std::size_t>(b.rows * b.columns), 2);
    for (const int method : {0, 1}) {
      SCOPED_TRACE(testing::Message() << a.rows << " x " << a.columns << ", method " << method);
      matrix_of<E> ax = filled<E>(a.rows, a.columns, x), ay = filled<E>(b.rows, b.columns, y), out(1, 1);
      array_of<E> scratch, room;
      ASSERT_EQ(0, family<E>::matrix_correlation(ax, ay, out, method, method == 0 ? scratch.handle() : nullptr,
                                                 method == 1 ? room.handle() : nullptr, &this->slot));
      const int rows = a.rows + b.rows - 1, columns = a.columns + b.columns - 1;
      ASSERT_EQ(rows, out.block()->rows);
      ASSERT_EQ(columns, out.block()->columns);
      const reference want = correlate(spread(x, a.rows, a.columns, columns), spread(y, b.rows, b.columns, columns));
      EXPECT_LT(error_in_epsilons<E>(values<E>(out), want), bound(method, x.size(), y.size()));
      EXPECT_TRUE(scratch.elements().empty() && room.elements().empty());
    }
  }
}

}  // namespace
