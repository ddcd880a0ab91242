// SPDX-License-Identifier: MIT
#include <algorithm>
#include <array>

#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

template <class E>
struct exports;
template <>
struct exports<toolkit::s> {
  static constexpr auto matrices = &qsRFPELTA_sMtrxMulH;
  static constexpr auto vector = &qsRFPELTA_sMtrxVecMulH;
  static constexpr auto solve = &qsRFPELTA_sLSEqH;
};
template <>
struct exports<toolkit::c> {
  static constexpr auto matrices = &qsRFPELTA_cMtrxMulH;
  static constexpr auto vector = &qsRFPELTA_cMtrxVecMulH;
  static constexpr auto solve = &qsRFPELTA_cLSEqH;
};

template <class E>
struct matrix : matrix_of<E> {
  matrix(std::int32_t rows, std::int32_t columns, const std::vector<toolkit::value_of<E>> &from)
      : matrix_of<E>(rows, columns) {
    std::memcpy(this->block()->elements, from.data(), from.size() * sizeof from[0]);
  }
};

template <class E>
std::span<toolkit::value_of<E>> elements(matrix_of<E> &m) {
  const auto count = static_cast<std::size_t>(m.block()->rows) * static_cast<std::size_t>(m.block()->columns);
  return {reinterpret_cast<toolkit::value_of<E> *>(m.block()->elements), count};
}

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

/// The shortest least-squares solution in double precision: singular values by one-sided Jacobi rotations, those up to
/// `cut` times the largest left out.
reference pseudo_solve(reference a, std::size_t m, std::size_t n, const reference &b, double cut) {
  const bool wide_matrix = m < n;  // then by the adjoint: x = A^H (A A^H)^+ b
  if (wide_matrix) {
    a = adjoint(a, m, n);
    std::swap(m, n);
  }
  reference v(n * n);
  for (std::size_t i = 0; i < n; ++i) v[i * n + i] = 1;
  for (int sweep = 0; sweep < 60; ++sweep) {
    for (std::size_t p = 0; p + 1 < n; ++p) {
      for (std::size_t q = p + 1; q < n; ++q) {
        double alpha = 0, beta = 0;
        std::complex<double> gamma = 0;
        for (std::size_t i = 0; i < m; ++i) {
          alpha += std::norm(a[i * n + p]);
          beta += std::norm(a[i * n + q]);
          gamma += std::conj(a[i * n + p]) * a[i * n + q];
        }
        if (std::abs(gamma) <= 1e-16 * std::sqrt(alpha * beta) || gamma == 0.0) continue;
        const double zeta = (beta - alpha) / (2 * std::abs(gamma));
        const double t = (zeta < 0 ? -1 : 1) / (std::abs(zeta) + std::sqrt(1 + zeta * zeta));
        const double c = 1 / std::sqrt(1 + t * t);
        const std::complex<double> s = c * t * gamma / std::abs(gamma);
        const auto rotate = [&](reference &x, std::size_t rows) {
          for (std::size_t i = 0; i < rows; ++i) {
            const auto xp = x[i * n + p], xq = x[i * n + q];
            x[i * n + p] = c * xp - std::conj(s) * xq;
            x[i * n + q] = s * xp + c * xq;
          }
        };
        rotate(a, m);
        rotate(v, n);
      }
    }
  }
  // Columns of a are now U S.
  std::vector<double> singular(n);
  for (std::size_t j = 0; j < n; ++j) {
    for (std::size_t i = 0; i < m; ++i) singular[j] += std::norm(a[i * n + j]);
    singular[j] = std::sqrt(singular[j]);
  }
  const double least = cut * *std::max_element(singular.begin(), singular.end());
  reference x(wide_matrix ? m : n);
  for (std::size_t j = 0; j < n; ++j) {
    if (!(singular[j] > least)) continue;
    std::complex<double> along = 0;
    if (wide_matrix) {
      for (std::size_t i = 0; i < n; ++i) along += std::conj(v[i * n + j]) * b[i];
      for (std::size_t i = 0; i < m; ++i) x[i] += a[i * n + j] * along / (singular[j] * singular[j]);
    } else {
      for (std::size_t i = 0; i < m; ++i) along += std::conj(a[i * n + j]) * b[i];
      for (std::size_t i = 0; i < n; ++i) x[i] += v[i * n + j] * along / (singular[j] * singular[j]);
    }
  }
  return x;
}

template <class E>
class Matrix : public testing::Test {
 protected:
  fake_host host{fake_host::unit::elements};
  array_of<E> first = array_of<E>(std::size_t{0}), second = array_of<E>(std::size_t{0}),
              third = array_of<E>(std::size_t{0});  // scratch

  std::int32_t solve(matrix_of<E> &a, array_of<E> &b, float tolerance, array_of<E> &x) {
    const std::int32_t code = exports<E>::solve(a.handle(), b.handle(), tolerance, x.handle(), first.handle(),
                                                second.handle(), third.handle());
    EXPECT_EQ(0, first.block()->count + second.block()->count + third.block()->count);
    return code;
  }
};
using single_letters = testing::Types<toolkit::s, toolkit::c>;
TYPED_TEST_SUITE(Matrix, single_letters);

TYPED_TEST(Matrix, ProductsAgreeWithTheDefinition) {
  using E = TypeParam;
  for (const auto &[m, k, n] : {std::array{1, 1, 1}, {2, 3, 4}, {17, 5, 1}, {1, 40, 33}, {40, 64, 33}}) {
    const auto count = [](int x, int y) { return static_cast<std::size_t>(x) * static_cast<std::size_t>(y); };
    const auto left = noise<E>(count(m, k), 1), right = noise<E>(count(k, n), 2);
    matrix<E> a(m, k, left), b(k, n, right);
    matrix_of<E> c;
    ASSERT_EQ(0, exports<E>::matrices(a.handle(), b.handle(), c.handle()));
    EXPECT_EQ(m, c.block()->rows);
    EXPECT_EQ(n, c.block()->columns);
    const auto size = [](int x) { return static_cast<std::size_t>(x); };
    EXPECT_LT(error_in_epsilons<E>(elements<E>(c), product(wide(left), wide(right), size(m), size(k), size(n))),
              sum_bound(size(k)));
    array_of<E> x = filled<E>(noise<E>(size(k), 3)), y;
    ASSERT_EQ(0, exports<E>::vector(a.handle(), x.handle(), y.handle()));
    EXPECT_LT(error_in_epsilons<E>(values<E>(y), product(wide(left), wide(noise<E>(size(k), 3)), size(m), size(k), 1)),
              sum_bound(size(k)));
    if (m == k) {
      ASSERT_EQ(0, exports<E>::matrices(a.handle(), b.handle(), b.handle()));  // onto an input
      EXPECT_TRUE(std::equal(elements<E>(b).begin(), elements<E>(b).end(), elements<E>(c).begin()));
    }
  }
}

TYPED_TEST(Matrix, EmptyAndWrongSizes) {
  using E = TypeParam;
  const auto run = [&](auto &a, auto &b, matrix_of<E> &c) {
    return exports<E>::matrices(a.handle(), b.handle(), c.handle());
  };
  matrix_of<E> tall(2, 0), flat(0, 3), square(2, 2), other(3, 2), c(1, 1), null;
  ASSERT_EQ(0, run(tall, flat, c));
  EXPECT_EQ(2, c.block()->rows);
  EXPECT_EQ(3, c.block()->columns);
  for (const auto &v : elements<E>(c))
    EXPECT_TRUE(std::isnan(std::real(v)) &&
                (!toolkit::is_complex<E> || std::isnan(std::imag(v + toolkit::value_of<E>{}))));
  ASSERT_EQ(0, run(flat, other, c));
  EXPECT_EQ(0, c.block()->rows);
  EXPECT_EQ(2, c.block()->columns);
  array_of<E> none(std::size_t{0}), two(std::size_t{2}), y(std::size_t{7}), null_vector;
  EXPECT_EQ(0, exports<E>::vector(tall.handle(), none.handle(), y.handle()));
  EXPECT_EQ(0, y.block()->count);

  const auto refused = [&](std::int32_t code, auto &a, auto &b) {
    matrix_of<E> out(2, 2);
    EXPECT_EQ(code, run(a, b, out));
    EXPECT_EQ(0, out.block()->rows);
    EXPECT_EQ(0, out.block()->columns);
  };
  refused(-20039, other, other);
  refused(-20003, null, other);
  matrix_of<E> negative(3, 2);
  negative.block()->rows = -3;
  refused(-20004, square, negative);
  negative.block()->rows = 3;
  matrix_of<E> long_column(1, 1), long_row(1, 1);  // the sizes are refused before an element is read
  long_column.block()->rows = 1 << 16;
  long_row.block()->columns = 1 << 16;
  refused(-20001, long_column, long_row);
  EXPECT_EQ(-20039, exports<E>::vector(other.handle(), none.handle(), y.handle()));
  EXPECT_EQ(-20003, exports<E>::vector(other.handle(), null_vector.handle(), y.handle()));
  two.block()->count = -2;
  EXPECT_EQ(-20004, exports<E>::vector(other.handle(), two.handle(), y.handle()));
  two.block()->count = 2;
  EXPECT_EQ(-20001, exports<E>::vector(other.handle(), two.handle(), nullptr));
  this->host.refuse_from = 0;
  EXPECT_EQ(-20001, exports<E>::vector(other.handle(), two.handle(), none.handle()));
}

/// A product of factors with a rank that is known.
template <class E>
std::vector<toolkit::value_of<E>> of_rank(std::size_t m, std::size_t n, std::size_t rank) {
  const auto c = product(wide(noise<E>(m * rank, 7)), wide(noise<E>(rank * n, 8)), m, rank, n);
  std::vector<toolkit::value_of<E>> out(c.size());
  for (std::size_t i = 0; i < c.size(); ++i) {
    if constexpr (toolkit::is_complex<E>)
      out[i] = toolkit::value_of<E>(c[i]);
    else
      out[i] = static_cast<float>(c[i].real());
  }
  return out;
}

TYPED_TEST(Matrix, LeastSquaresAgreesWithSingularValuesInDoublePrecision) {
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
    for (const float tolerance : {0.F, 1e-5F, -1.F}) {
      if (tolerance < 0 && p.rank < std::min(p.m, p.n)) continue;  // machine precision: the rounding itself counts
      SCOPED_TRACE(testing::Message() << p.name << ", tolerance " << tolerance);
      auto a = p.rank == std::min(p.m, p.n) ? noise<E>(p.m * p.n, 5) : of_rank<E>(p.m, p.n, p.rank);
      for (std::size_t i = 0; i < a.size(); ++i)
        if (p.n > 1)
          a[i] *=
              static_cast<float>(std::pow(p.column_scale, static_cast<double>(i % p.n) / static_cast<double>(p.n - 1)));
      const auto rhs = noise<E>(p.m, 6);
      matrix<E> left(static_cast<std::int32_t>(p.m), static_cast<std::int32_t>(p.n), a);
      array_of<E> b = filled<E>(rhs), x;
      ASSERT_EQ(0, this->solve(left, b, tolerance, x));
      const double cut = tolerance > 0 ? 1e-5 : static_cast<double>(std::max(p.m, p.n)) * 0x1p-23;
      const auto want = pseudo_solve(wide(a), p.m, p.n, wide(rhs), cut);
      EXPECT_LT(error_in_epsilons<E>(values<E>(x), want), p.bound);
      ASSERT_EQ(0, this->solve(left, b, tolerance, b));  // onto the right-hand side
      EXPECT_EQ(0, std::memcmp(b.elements().data(), x.elements().data(), x.elements().size_bytes()));
    }
  }
}

TYPED_TEST(Matrix, LeastSquaresRefuses) {
  using E = TypeParam;
  constexpr float nan = std::numeric_limits<float>::quiet_NaN();
  matrix<E> a(3, 2, noise<E>(6));
  matrix_of<E> no_rows(0, 2), no_columns(2, 0), null;
  array_of<E> b = filled<E>(noise<E>(3)), short_b(std::size_t{2}), null_vector, x(std::size_t{1});
  EXPECT_EQ(-20003, this->solve(no_rows, b, 0, x));
  EXPECT_EQ(0, x.block()->count);
  EXPECT_EQ(-20003, this->solve(no_columns, b, 0, x));
  EXPECT_EQ(-20003, this->solve(null, b, 0, x));
  EXPECT_EQ(-20003, this->solve(a, null_vector, 0, x));
  EXPECT_EQ(-20002, this->solve(a, short_b, 0, x));
  EXPECT_EQ(-20061, this->solve(a, b, nan, x));
  EXPECT_EQ(-20061, exports<E>::solve(a.handle(), b.handle(), 0, x.handle(), this->first.handle(), this->first.handle(),
                                      this->third.handle()));
  for (int missing = 0; missing < 3; ++missing) {
    for (const float tolerance : {0.F, 1e-6F}) {
      const auto scratch = [&](int i, array_of<E> &array) { return missing == i ? nullptr : array.handle(); };
      EXPECT_EQ(-20999, exports<E>::solve(a.handle(), b.handle(), tolerance, x.handle(), scratch(0, this->first),
                                          scratch(1, this->second), scratch(2, this->third)));
    }
  }
  values<E>(b)[1] = nan;
  EXPECT_EQ(-20068, this->solve(a, b, 0, x));
  values<E>(b)[1] = 1;
  for (const float tolerance : {0.F, 1e-6F}) {
    for (int n = 0;; ++n) {
      array_of<E> out(std::size_t{9});
      this->host.calls.clear();
      this->host.refuse_from = n;
      this->host.refuse_until = n + 1;
      const std::int32_t code = this->solve(a, b, tolerance, out);
      this->host.refuse_from = -1;
      if (static_cast<int>(this->host.calls.size()) <= n) break;
      EXPECT_TRUE(code == -20001 || code == 0);
      EXPECT_TRUE(code == 0 || out.elements().empty());
    }
  }
}

}  // namespace
