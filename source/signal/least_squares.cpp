// SPDX-License-Identifier: MIT
#include "signal/least_squares.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <new>

#include "qsrfhs/math/mkl_memory.hpp"
#include "qsrfhs/math/mkl_section.hpp"
#include "signal/lapack.hpp"
#include "signal/sample_type.hpp"

namespace dsp {
namespace {

template <class T>
constexpr const char *adjoint = is_complex<T> ? "C" : "T";

template <class T>
auto *raw(T *x) noexcept {
  return reinterpret_cast<typename lapack<T>::element *>(x);
}

template <class T>
T conjugate(T v) noexcept {
  if constexpr (is_complex<T>)
    return std::conj(v);
  else
    return v;
}

std::size_t product(MKL_INT a, MKL_INT b) noexcept {
  return static_cast<std::size_t>(a) * static_cast<std::size_t>(b);
}

}  // namespace

template <class T>
least_squares<T>::least_squares(MKL_INT rows, MKL_INT columns, MKL_INT right_sides)
    : rows_(rows),
      columns_(columns),
      right_sides_(right_sides),
      tall_(std::max(rows, columns)),
      narrow_(std::min(rows, columns)),
      matrix_(product(tall_, narrow_)),
      sides_(product(tall_, right_sides)),
      factors_(static_cast<std::size_t>(narrow_)),
      singular_(static_cast<std::size_t>(narrow_)) {
  // The best sizes of the workspaces, asked of each routine.
  const MKL_INT ask = -1;
  MKL_INT info = 0, rank = 0, integers = 0;
  std::array<T, 3> best{};
  real reals = 0;
  const real cut = 0;
  if constexpr (is_complex<T>) {
    lapack<T>::gelsd(&rows_, &columns_, &right_sides_, raw(matrix_.data()), &rows_, raw(sides_.data()), &tall_,
                     singular_.data(), &cut, &rank, raw(&best[1]), &ask, &reals, &integers, &info);
  } else {
    lapack<T>::gelsd(&rows_, &columns_, &right_sides_, matrix_.data(), &rows_, sides_.data(), &tall_, singular_.data(),
                     &cut, &rank, &best[1], &ask, &integers, &info);
  }
  lapack<T>::geqrf(&tall_, &narrow_, raw(matrix_.data()), &tall_, raw(factors_.data()), raw(best.data()), &ask, &info);
  lapack<T>::multiply_by_q("L", adjoint<T>, &tall_, &right_sides_, &narrow_, raw(matrix_.data()), &tall_,
                           raw(factors_.data()), raw(sides_.data()), &tall_, raw(&best[2]), &ask, &info);
  // Single precision rounds large sizes, down as well as up.
  const real largest = std::max({std::real(best[0]), std::real(best[1]), std::real(best[2])});
  const double wanted = std::ceil(static_cast<double>(largest) * (1 + std::numeric_limits<real>::epsilon()));
  work_count_ = static_cast<MKL_INT>(std::max(wanted, 3.0 * narrow_ + 1));
  work_ = qsrfhs::aligned_buffer<T>(static_cast<std::size_t>(work_count_));
  real_work_ = qsrfhs::aligned_buffer<real>(static_cast<std::size_t>(std::max(reals, real(2) * real(tall_) + 2)));
  integer_work_ = qsrfhs::aligned_buffer<MKL_INT>(static_cast<std::size_t>(std::max(integers, narrow_)));
}

template <class T>
void least_squares<T>::load_right_sides(std::span<const T> b) {
  for (MKL_INT k = 0; k < right_sides_; ++k) {
    T *const column = sides_.data() + product(k, tall_);
    for (MKL_INT i = 0; i < rows_; ++i) column[i] = b[product(i, right_sides_) + static_cast<std::size_t>(k)];
    std::fill(column + rows_, column + tall_, T{});
  }
}

/// False, in doubt, where the estimated condition of R comes near what rcond leaves.
template <class T>
bool least_squares<T>::has_full_rank(real rcond) {
  // The estimate is in the 1-norm and may be too good by a small factor; singular values are within sqrt(n) of it.
  real estimate = 0;
  MKL_INT info = 0;
  if constexpr (is_complex<T>)
    lapack<T>::trcon("1", "U", "N", &narrow_, raw(matrix_.data()), &tall_, &estimate, raw(work_.data()),
                     real_work_.data(), &info);
  else
    lapack<T>::trcon("1", "U", "N", &narrow_, matrix_.data(), &tall_, &estimate, work_.data(), integer_work_.data(),
                     &info);
  const real doubt = std::max(rcond, std::numeric_limits<real>::epsilon()) * 8 * static_cast<real>(narrow_);
  return info == 0 && estimate > doubt;
}

/// A = Q R where there are at least as many rows as columns, A^H = Q R otherwise; x is left in the right sides.
template <class T>
bool least_squares<T>::solve_by_qr(std::span<const T> a, std::span<const T> b, real rcond) {
  const bool wide = rows_ < columns_;
  for (MKL_INT i = 0; i < rows_; ++i) {
    const T *const row = a.data() + product(i, columns_);
    if (wide) {
      std::transform(row, row + columns_, matrix_.data() + product(i, tall_), &conjugate<T>);
    } else {
      for (MKL_INT j = 0; j < columns_; ++j) matrix_.data()[product(j, tall_) + static_cast<std::size_t>(i)] = row[j];
    }
  }
  MKL_INT info = 0;
  lapack<T>::geqrf(&tall_, &narrow_, raw(matrix_.data()), &tall_, raw(factors_.data()), raw(work_.data()), &work_count_,
                   &info);
  if (info != 0 || !has_full_rank(rcond)) return false;

  load_right_sides(b);
  const auto multiply_by_q = [&](const char *how) {
    lapack<T>::multiply_by_q("L", how, &tall_, &right_sides_, &narrow_, raw(matrix_.data()), &tall_,
                             raw(factors_.data()), raw(sides_.data()), &tall_, raw(work_.data()), &work_count_, &info);
  };
  const auto solve_triangle = [&](const char *how) {
    lapack<T>::trtrs("U", how, "N", &narrow_, &right_sides_, raw(matrix_.data()), &tall_, raw(sides_.data()), &tall_,
                     &info);
  };
  if (wide) {
    solve_triangle(adjoint<T>);
    multiply_by_q("N");
  } else {
    multiply_by_q(adjoint<T>);
    solve_triangle("N");
  }
  return info == 0;
}

template <class T>
std::optional<MKL_INT> least_squares<T>::solve_by_singular_values(std::span<const T> a, std::span<const T> b,
                                                                  real rcond) {
  for (MKL_INT i = 0; i < rows_; ++i)
    for (MKL_INT j = 0; j < columns_; ++j)
      matrix_.data()[product(j, rows_) + static_cast<std::size_t>(i)] =
          a[product(i, columns_) + static_cast<std::size_t>(j)];
  load_right_sides(b);
  MKL_INT rank = 0, info = 0;
  if constexpr (is_complex<T>)
    lapack<T>::gelsd(&rows_, &columns_, &right_sides_, raw(matrix_.data()), &rows_, raw(sides_.data()), &tall_,
                     singular_.data(), &rcond, &rank, raw(work_.data()), &work_count_, real_work_.data(),
                     integer_work_.data(), &info);
  else
    lapack<T>::gelsd(&rows_, &columns_, &right_sides_, matrix_.data(), &rows_, sides_.data(), &tall_, singular_.data(),
                     &rcond, &rank, work_.data(), &work_count_, integer_work_.data(), &info);
  if (info != 0) return std::nullopt;
  return rank;
}

template <class T>
std::optional<MKL_INT> least_squares<T>::solve(std::span<const T> a, std::span<const T> b, real rcond, std::span<T> x) {
  std::optional<MKL_INT> rank = narrow_;
  if (!solve_by_qr(a, b, rcond)) rank = solve_by_singular_values(a, b, rcond);
  if (!rank) return rank;
  for (MKL_INT j = 0; j < columns_; ++j)
    for (MKL_INT k = 0; k < right_sides_; ++k)
      x[product(j, right_sides_) + static_cast<std::size_t>(k)] =
          sides_.data()[product(k, tall_) + static_cast<std::size_t>(j)];
  return rank;
}

template class least_squares<float>;
template class least_squares<double>;
template class least_squares<std::complex<float>>;
template class least_squares<std::complex<double>>;

}  // namespace dsp
