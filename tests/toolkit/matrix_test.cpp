// SPDX-License-Identifier: MIT
#include <algorithm>
#include <array>

#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

reference product(const reference &a, const reference &b, std::size_t m, std::size_t k, std::size_t n) {
  reference c(m * n);
  for (std::size_t i = 0; i < m; ++i)
    for (std::size_t l = 0; l < k; ++l)
      for (std::size_t j = 0; j < n; ++j) c[i * n + j] += a[i * k + l] * b[l * n + j];
  return c;
}

reference adjoint(const reference &a, std::size_t rows, std::size_t columns) {
  reference out(a.size());
  for (std::size_t i = 0; i < rows; ++i)
    for (std::size_t j = 0; j < columns; ++j) out[j * rows + i] = std::conj(a[i * columns + j]);
  return out;
}

/// G x = y, for a Hermitian G that is positive definite.
reference solve(reference g, reference y) {
  const std::size_t n = y.size();
  for (std::size_t p = 0; p < n; ++p) {
    for (std::size_t i = p + 1; i < n; ++i) {
      const auto factor = g[i * n + p] / g[p * n + p];
      for (std::size_t j = p; j < n; ++j) g[i * n + j] -= factor * g[p * n + j];
      y[i] -= factor * y[p];
    }
  }
  for (std::size_t p = n; p-- > 0;) {
    for (std::size_t j = p + 1; j < n; ++j) y[p] -= g[p * n + j] * y[j];
    y[p] /= g[p * n + p];
  }
  return y;
}

/// A matrix as the product of two of full rank: m rows by rank, rank rows by n.
struct factors {
  std::size_t m, rank, n;
  reference l, r;

  /// The shortest x of those that make |L R x - b| smallest: R^H (R R^H)^-1 (L^H L)^-1 L^H b.
  [[nodiscard]] reference least_squares(const reference &b) const {
    const reference lh = adjoint(l, m, rank), rh = adjoint(r, rank, n);
    const reference inner = solve(product(lh, l, rank, m, rank), product(lh, b, rank, m, 1));
    return product(rh, solve(product(r, rh, rank, n, rank), inner), n, rank, 1);
  }
};

template <class E>
class Matrix : public toolkit_test<E> {
 protected:
  array_of<E> first = array_of<E>(0), second = array_of<E>(0), third = array_of<E>(0);  // scratch

  std::int32_t solve(matrix_of<E> &a, array_of<E> &b, float tolerance, array_of<E> &x) {
    const std::int32_t code = partial_family<E>::least_squares(a, b, tolerance, x, first, second, third);
    EXPECT_EQ(0, first.block()->count + second.block()->count + third.block()->count);
    return code;
  }
};
using single_letters = testing::Types<toolkit::s, toolkit::c>;
TYPED_TEST_SUITE(Matrix, single_letters);

TYPED_TEST(Matrix, ProductsAgreeWithTheDefinition) {
  using E = TypeParam;
  for (const auto &[m, k, n] : {std::array{1U, 1U, 1U}, {2, 3, 4}, {17, 5, 1}, {1, 40, 33}, {40, 64, 33}, {7, 7, 9}}) {
    const auto left = noise<E>(m * k, 1), right = noise<E>(k * n, 2), column = noise<E>(k, 3);
    const auto rows = static_cast<std::int32_t>(m), inner = static_cast<std::int32_t>(k),
               columns = static_cast<std::int32_t>(n);
    matrix_of<E> a = filled<E>(rows, inner, left), b = filled<E>(inner, columns, right), c;
    ASSERT_EQ(0, partial_family<E>::multiply(a, b, c));
    EXPECT_EQ(rows, c.block()->rows);
    EXPECT_EQ(columns, c.block()->columns);
    EXPECT_LT(error_in_epsilons<E>(values<E>(c), product(wide(left), wide(right), m, k, n)), sum_bound(k));
    array_of<E> x = filled<E>(column), y;
    ASSERT_EQ(0, partial_family<E>::multiply_vector(a, x, y));
    EXPECT_LT(error_in_epsilons<E>(values<E>(y), product(wide(left), wide(column), m, k, 1)), sum_bound(k));
    ASSERT_EQ(0, partial_family<E>::multiply(a, b, b));  // onto an input
    EXPECT_TRUE(same_bytes(b.elements(), c.elements()));
  }
}

TYPED_TEST(Matrix, ProductsOfNothing) {
  using E = TypeParam;
  using P = partial_family<E>;
  matrix_of<E> tall(2, 0), flat(0, 3), other(3, 2), c(1, 1);
  ASSERT_EQ(0, P::multiply(tall, flat, c));
  EXPECT_EQ(2, c.block()->rows);
  EXPECT_EQ(3, c.block()->columns);
  for (const std::complex<double> v : values<E>(c))
    EXPECT_TRUE(std::isnan(v.real()) && (!toolkit::is_complex<E> || std::isnan(v.imag())));
  ASSERT_EQ(0, P::multiply(flat, other, c));
  EXPECT_EQ(0, c.block()->rows);
  EXPECT_EQ(2, c.block()->columns);
  array_of<E> none(0), y(7);
  EXPECT_EQ(0, P::multiply_vector(tall, none, y));
  EXPECT_EQ(0, y.block()->count);
}

TYPED_TEST(Matrix, LeastSquaresAgreesWithNormalEquationsInDoublePrecision) {
  using E = TypeParam;
  struct problem {
    const char *name;
    std::size_t m, n, rank;
    double column_scale;  // of the last column against the first
    double bound;         // in epsilons
  };
  const problem problems[] = {{"one", 1, 1, 1, 1, 4},
                              {"square", 8, 8, 8, 1, 2000},
                              {"over-determined", 40, 9, 9, 1, 100},
                              {"under-determined", 9, 40, 9, 1, 100},
                              {"deficient", 30, 12, 5, 1, 400},
                              {"deficient, wide", 12, 30, 5, 1, 400},
                              {"ill-scaled", 30, 6, 6, 1e-3, 1e4},
                              {"row", 1, 6, 1, 1, 20},
                              {"column", 6, 1, 1, 1, 20}};
  for (const problem &p : problems) {
    reference identity(p.rank * p.rank);
    for (std::size_t i = 0; i < p.rank; ++i) identity[i * (p.rank + 1)] = 1;
    factors f{p.m, p.rank, p.n, wide(noise<E>(p.m * p.rank, 5)), wide(noise<E>(p.rank * p.n, 8))};
    if (p.rank == p.n) f.r = identity;
    if (p.rank == p.m) f.l = identity;
    if (p.rank == p.m && p.m == p.n) f.r = wide(noise<E>(p.m * p.n, 5));
    for (std::size_t i = 0; p.column_scale < 1 && i < f.l.size(); ++i)
      f.l[i] = std::complex<float>(
          f.l[i] * std::pow(p.column_scale, static_cast<double>(i % p.n) / static_cast<double>(p.n - 1)));
    std::vector<toolkit::value_of<E>> a;
    for (const auto &v : product(f.l, f.r, p.m, p.rank, p.n)) {
      if constexpr (toolkit::is_complex<E>)
        a.emplace_back(v);
      else
        a.push_back(static_cast<float>(v.real()));
    }
    const auto rhs = noise<E>(p.m, 6);
    const reference want = f.least_squares(wide(rhs));
    for (const float tolerance : {0.F, 1e-5F, -1.F}) {
      if (tolerance < 0 && p.rank < std::min(p.m, p.n)) continue;  // machine precision: the rounding itself counts
      SCOPED_TRACE(testing::Message() << p.name << ", tolerance " << tolerance);
      matrix_of<E> left = filled<E>(static_cast<std::int32_t>(p.m), static_cast<std::int32_t>(p.n), a);
      array_of<E> b = filled<E>(rhs), x;
      ASSERT_EQ(0, this->solve(left, b, tolerance, x));
      EXPECT_LT(error_in_epsilons<E>(values<E>(x), want), p.bound);
      ASSERT_EQ(0, this->solve(left, b, tolerance, b));  // onto the right-hand side
      EXPECT_TRUE(same_bytes(b.elements(), x.elements()));
    }
  }
}

}  // namespace
