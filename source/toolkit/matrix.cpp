// Matrix products, and least squares by singular values. SPDX-License-Identifier: MIT
#include <lumra/toolkit.h>

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <initializer_list>
#include <limits>
#include <span>

#include "toolkit/frame.hpp"
#include "toolkit/lapack.hpp"

namespace toolkit {
namespace {

void check_sizes(std::initializer_list<std::int32_t> sizes) {
  for (const std::int32_t size : sizes) require(size >= 0, negative_dimension);
}

template <class E>
void multiply_matrices(input_matrix<E> a, input_matrix<E> b, output_matrix<E> &c) {
  require(a.which().has_block() && b.which().has_block(), empty_input);
  const std::int32_t m = a.view().rows, k = a.view().columns, n = b.view().columns;
  check_sizes({m, k, b.view().rows, n});
  require(k == b.view().rows, inner_dimensions_differ);
  const auto bits = [](std::int32_t size) {
    return size == 0 ? 0 : std::bit_width(static_cast<std::uint32_t>(size - 1));
  };
  require(bits(m) + bits(n) < 31, no_memory);
  a.copy_if_same(c);
  b.copy_if_same(c);
  const auto product = c.resize(m, n);
  if (m == 0 || n == 0) return;
  if (k == 0) {
    constexpr real_of<E> nan = std::numeric_limits<real_of<E>>::quiet_NaN();
    value_of<E> undefined = nan;
    if constexpr (is_complex<E>) undefined = {nan, nan};
    std::fill_n(product.data, product.size(), undefined);
    return;
  }
  multiply(m, n, k, a.view().data, b.view().data, product.data);
}

template <class E>
void multiply_vector(input_matrix<E> a, handle<E> vector, output<E> &y) {
  input<E> x(vector);
  require(a.which().has_block() && x.which().has_block(), empty_input);
  const std::int32_t m = a.view().rows, k = a.view().columns;
  check_sizes({m, k, (*vector)->count});
  require(k == x.count(), inner_dimensions_differ);
  a.copy_if_same(y);
  x.copy_if_same(y);
  const auto product = y.resize(k == 0 ? 0 : m);
  if (!product.empty()) multiply(m, k, a.view().data, x.values().data(), product.data());
}

bool finite(float v) noexcept {
  return std::isfinite(v);
}
bool finite(std::complex<float> v) noexcept {
  return std::isfinite(v.real()) && std::isfinite(v.imag());
}

void check_info(MKL_INT info) {
  require(info >= 0, bad_option);
  require(info == 0, not_finite);
}

/// Workspace of a LAPACK routine in one array: the complex or real elements first, then reals and integers.
template <class T>
class lapack_workspace {
 public:
  /// `ask` calls the routine with the room it is given, which wants to know the sizes.
  template <class Ask>
  lapack_workspace(std::int64_t singular, std::int64_t reals, std::int64_t integers, Ask ask)
      : singular_(singular), reals_(reals), integers_(integers) {
    T work{};
    float real_work = 0;
    MKL_INT integer_work = 0;
    check_info(ask(lapack_room<T>{&real_work, &work, &real_work, &integer_work, -1}));
    const double size = static_cast<double>(std::real(work)) * (1 + 1e-6);  // it was rounded to a float
    require(size < static_cast<double>(std::numeric_limits<MKL_INT>::max()), no_memory);
    work_ = static_cast<std::int64_t>(size) + 1;
    reals_ = std::max(reals_, static_cast<std::int64_t>(real_work));
    integers_ = std::max<std::int64_t>(integers_, integer_work);
  }

  [[nodiscard]] std::int64_t elements() const noexcept {
    constexpr std::int64_t words = sizeof(T) / 4;  // of 4 bytes, as reals and integers have
    return work_ + (singular_ + reals_ + integers_ + words - 1) / words;
  }

  [[nodiscard]] lapack_room<T> in(T *memory) const noexcept {
    auto *const singular = reinterpret_cast<float *>(memory + work_);
    float *const reals = singular + singular_;
    return {singular, memory, reals, reinterpret_cast<MKL_INT *>(reals + reals_), static_cast<MKL_INT>(work_)};
  }

 private:
  std::int64_t singular_, reals_, integers_, work_ = 0;
};

template <class E>
struct equation {
  matrix_view<const value_of<E>> a;
  std::span<const value_of<E>> b;
  std::span<value_of<E>> x;
};

/// By LAPACK's own least squares.
template <class E>
void solve_with_cut(const equation<E> &eq, float cut, value_of<E> *a, scratch<E> &rhs, scratch<E> &room) {
  using value = value_of<E>;
  const std::int32_t m = eq.a.rows, n = eq.a.columns;
  const auto b = rhs.resize(std::max(m, n));
  std::copy(eq.b.begin(), eq.b.end(), b.begin());
  const auto solve = [&](const lapack_room<value> &in) { return solve_least_squares(m, n, a, b.data(), cut, in); };
  const lapack_workspace<value> workspace(std::min(m, n), 0, 0, solve);
  check_info(solve(workspace.in(room.resize(workspace.elements()).data())));
  std::copy_n(b.begin(), n, eq.x.begin());
}

/// By the pseudo-inverse V S^+ U^H.
template <class E>
void solve_with_pseudo_inverse(const equation<E> &eq, value_of<E> *a, scratch<E> &rhs, scratch<E> &room) {
  using value = value_of<E>;
  const std::int32_t m = eq.a.rows, n = eq.a.columns, k = std::min(m, n), larger = std::max(m, n);
  const std::int64_t k2 = std::int64_t{k} * k;
  const std::int64_t reals = is_complex<E> ? std::max(5 * (k2 + k), 2 * std::int64_t{larger} * k + 2 * k2 + k) : 0;
  const lapack_workspace<value> workspace(k, reals, 8 * std::int64_t{k}, [&](const lapack_room<value> &in) {
    return decompose(m, n, a, nullptr, nullptr, in);
  });
  const std::int64_t of_u = std::int64_t{m} * k, of_vh = std::int64_t{k} * n;
  value *const u = room.resize(of_u + of_vh + workspace.elements()).data();
  value *const vh = u + of_u;
  const lapack_room<value> in = workspace.in(vh + of_vh);
  check_info(decompose(m, n, a, u, vh, in));

  const auto projected = rhs.resize(k);
  multiply_adjoint(m, k, u, eq.b.data(), projected.data());
  const float cut = static_cast<float>(larger) * std::numeric_limits<float>::epsilon() * in.singular[0];
  for (std::int32_t i = 0; i < k; ++i) {
    auto &component = projected[static_cast<std::size_t>(i)];
    component = in.singular[i] > cut ? component / in.singular[i] : value{};
  }
  multiply_adjoint(k, n, vh, projected.data(), eq.x.data());
}

template <class E>
void least_squares(input_matrix<E> a, input<E> b, float tolerance, output<E> &x, scratch<E> matrix, scratch<E> rhs,
                   scratch<E> room) {
  require(a.which().has_block() && b.which().has_block(), empty_input);
  const auto [data, m, n] = a.view();
  require(m >= 1 && n >= 1, empty_input);
  require(b.count() == m, lengths_differ);
  require(std::isfinite(tolerance), bad_option);
  refuse_sharing(matrix, a, b, x, rhs, room);
  refuse_sharing(rhs, a, b, x, room);
  refuse_sharing(room, a, b, x);
  const auto usable = [](value_of<E> v) { return finite(v); };
  require(std::all_of(data, data + a.view().size(), usable), not_finite);
  require(std::all_of(b.values().begin(), b.values().end(), usable), not_finite);
  a.copy_if_same(x);
  b.copy_if_same(x);

  const equation<E> eq{a.view(), b.values(), x.resize(n)};
  const auto by_columns = matrix.resize(std::int64_t{m} * n);
  for (std::int32_t row = 0; row < m; ++row)
    for (std::int32_t column = 0; column < n; ++column)
      by_columns[static_cast<std::size_t>(std::int64_t{column} * m + row)] = eq.a.row(row)[column];
  require(rhs.present() && room.present(), no_scratch);
  if (tolerance != 0)
    solve_with_cut(eq, tolerance, by_columns.data(), rhs, room);
  else
    solve_with_pseudo_inverse(eq, by_columns.data(), rhs, room);
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define MATRIX(E)                                                                                                      \
  int32_t qsRFPELTA_##E##MtrxMulH(matrix_handle<E> a, matrix_handle<E> b, matrix_handle<E> out) {                      \
    return toolkit_call([&](output_matrix<E> &product) { multiply_matrices<E>(a, b, product); },                       \
                        output_matrix<E>(out));                                                                        \
  }                                                                                                                    \
  int32_t qsRFPELTA_##E##MtrxVecMulH(matrix_handle<E> a, handle<E> x, handle<E> y) {                                   \
    return toolkit_call([&](output<E> &product) { multiply_vector<E>(a, x, product); }, output<E>(y));                 \
  }                                                                                                                    \
  int32_t qsRFPELTA_##E##LSEqH(matrix_handle<E> a, handle<E> b, float tolerance, handle<E> x, handle<E> matrixScratch, \
                               handle<E> rhsScratch, handle<E> workScratch) {                                          \
    return toolkit_call(                                                                                               \
        [&](output<E> &solution) {                                                                                     \
          least_squares<E>(a, b, tolerance, solution, matrixScratch, rhsScratch, workScratch);                         \
        },                                                                                                             \
        output<E>(x));                                                                                                 \
  }
MATRIX(s)
MATRIX(c)
#undef MATRIX
