// Least squares by QR, and by singular values where the rank is in doubt.
// SPDX-License-Identifier: MIT
#pragma once

#include <mkl_types.h>

#include <complex>
#include <cstdint>
#include <optional>
#include <span>
#include <type_traits>

#include "qsrfhs/util/aligned_buffer.hpp"

namespace dsp {

template <class T>
class least_squares {
 public:
  using real = decltype(std::real(T{}));

  /// Sizes of at least 1 that fit MKL_INT. Throws std::bad_alloc.
  least_squares(MKL_INT rows, MKL_INT columns, MKL_INT right_sides);

  /// Matrices row by row, all elements finite. Singular values up to rcond times the largest count as zero. The rank
  /// found; nothing where the singular values did not converge. Throws std::bad_alloc.
  std::optional<MKL_INT> solve(std::span<const T> a, std::span<const T> b, real rcond, std::span<T> x);

  [[nodiscard]] MKL_INT rows() const noexcept { return rows_; }
  [[nodiscard]] MKL_INT columns() const noexcept { return columns_; }
  [[nodiscard]] MKL_INT right_sides() const noexcept { return right_sides_; }

 private:
  bool solve_by_qr(std::span<const T> a, std::span<const T> b, real rcond);
  std::optional<MKL_INT> solve_by_singular_values(std::span<const T> a, std::span<const T> b, real rcond);
  [[nodiscard]] bool has_full_rank(real rcond);
  void load_right_sides(std::span<const T> b);

  MKL_INT rows_, columns_, right_sides_;
  MKL_INT tall_, narrow_;  // the larger and the smaller of rows and columns
  MKL_INT work_count_ = 0;
  qsrfhs::aligned_buffer<T> matrix_;  // column by column: tall_ x narrow_ for QR
  qsrfhs::aligned_buffer<T> sides_;   // tall_ x right_sides_, b and then x
  qsrfhs::aligned_buffer<T> factors_, work_;
  qsrfhs::aligned_buffer<real> singular_, real_work_;
  qsrfhs::aligned_buffer<MKL_INT> integer_work_;
};

}  // namespace dsp
