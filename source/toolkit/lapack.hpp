// BLAS and LAPACK of matrices by type. LAPACK's matrices lie column by column. SPDX-License-Identifier: MIT
#pragma once

#include <mkl_cblas.h>
#include <mkl_lapack.h>

#include <complex>
#include <cstdint>

#include "qsrfhs/math/mkl_section.hpp"

namespace toolkit {

static_assert(sizeof(MKL_INT) == sizeof(std::int32_t));
static_assert(sizeof(MKL_Complex8) == sizeof(std::complex<float>));

/// C = A B of m x k and k x n elements, row by row.
inline void multiply(MKL_INT m, MKL_INT n, MKL_INT k, const float *a, const float *b, float *c) noexcept {
  const qsrfhs::mkl_section section;
  cblas_sgemm(CblasRowMajor, CblasNoTrans, CblasNoTrans, m, n, k, 1.0F, a, k, b, n, 0.0F, c, n);
}
inline void multiply(MKL_INT m, MKL_INT n, MKL_INT k, const std::complex<float> *a, const std::complex<float> *b,
                     std::complex<float> *c) noexcept {
  const qsrfhs::mkl_section section;
  const std::complex<float> one = 1.0F, zero = 0.0F;
  cblas_cgemm(CblasRowMajor, CblasNoTrans, CblasNoTrans, m, n, k, &one, a, k, b, n, &zero, c, n);
}

/// y = A x of m x k elements, row by row.
inline void multiply(MKL_INT m, MKL_INT k, const float *a, const float *x, float *y) noexcept {
  const qsrfhs::mkl_section section;
  cblas_sgemv(CblasRowMajor, CblasNoTrans, m, k, 1.0F, a, k, x, 1, 0.0F, y, 1);
}
inline void multiply(MKL_INT m, MKL_INT k, const std::complex<float> *a, const std::complex<float> *x,
                     std::complex<float> *y) noexcept {
  const qsrfhs::mkl_section section;
  const std::complex<float> one = 1.0F, zero = 0.0F;
  cblas_cgemv(CblasRowMajor, CblasNoTrans, m, k, &one, a, k, x, 1, &zero, y, 1);
}

/// y = A^H x, A of m x n elements column by column, as a product of matrices.
inline void multiply_adjoint(MKL_INT m, MKL_INT n, const float *a, const float *x, float *y) noexcept {
  const qsrfhs::mkl_section section;
  cblas_sgemm(CblasColMajor, CblasTrans, CblasNoTrans, n, 1, m, 1.0F, a, m, x, m, 0.0F, y, n);
}
inline void multiply_adjoint(MKL_INT m, MKL_INT n, const std::complex<float> *a, const std::complex<float> *x,
                             std::complex<float> *y) noexcept {
  const qsrfhs::mkl_section section;
  const std::complex<float> one = 1.0F, zero = 0.0F;
  cblas_cgemm(CblasColMajor, CblasConjTrans, CblasNoTrans, n, 1, m, &one, a, m, x, m, &zero, y, n);
}

/// What a decomposition of an m x n matrix is given. `work` of work_size elements; -1 asks for the sizes instead.
template <class T>
struct lapack_room {
  float *singular;  // min(m, n)
  T *work;
  float *real_work;  // complex types only
  MKL_INT *integer_work;
  MKL_INT work_size;
};

/// Least squares of A x = b, with singular values up to `cut` times the largest taken as zero; x lies in b, which has
/// max(m, n) elements. LAPACK's info.
inline MKL_INT solve_least_squares(MKL_INT m, MKL_INT n, float *a, float *b, float cut,
                                   const lapack_room<float> &room) noexcept {
  const qsrfhs::mkl_section section;
  const MKL_INT one = 1, rows_of_b = m > n ? m : n;
  MKL_INT rank = 0, info = 0;
  sgelsd(&m, &n, &one, a, &m, b, &rows_of_b, room.singular, &cut, &rank, room.work, &room.work_size, room.integer_work,
         &info);
  return info;
}
inline MKL_INT solve_least_squares(MKL_INT m, MKL_INT n, std::complex<float> *a, std::complex<float> *b, float cut,
                                   const lapack_room<std::complex<float>> &room) noexcept {
  const qsrfhs::mkl_section section;
  const MKL_INT one = 1, rows_of_b = m > n ? m : n;
  MKL_INT rank = 0, info = 0;
  cgelsd(&m, &n, &one, reinterpret_cast<MKL_Complex8 *>(a), &m, reinterpret_cast<MKL_Complex8 *>(b), &rows_of_b,
         room.singular, &cut, &rank, reinterpret_cast<MKL_Complex8 *>(room.work), &room.work_size, room.real_work,
         room.integer_work, &info);
  return info;
}

/// A = U S V^H with k = min(m, n): u of m x k, vh of k x n elements. LAPACK's info.
inline MKL_INT decompose(MKL_INT m, MKL_INT n, float *a, float *u, float *vh, const lapack_room<float> &room) noexcept {
  const qsrfhs::mkl_section section;
  const MKL_INT k = m < n ? m : n;
  MKL_INT info = 0;
  sgesdd("S", &m, &n, a, &m, room.singular, u, &m, vh, &k, room.work, &room.work_size, room.integer_work, &info);
  return info;
}
inline MKL_INT decompose(MKL_INT m, MKL_INT n, std::complex<float> *a, std::complex<float> *u, std::complex<float> *vh,
                         const lapack_room<std::complex<float>> &room) noexcept {
  const qsrfhs::mkl_section section;
  const MKL_INT k = m < n ? m : n;
  MKL_INT info = 0;
  cgesdd("S", &m, &n, reinterpret_cast<MKL_Complex8 *>(a), &m, room.singular, reinterpret_cast<MKL_Complex8 *>(u), &m,
         reinterpret_cast<MKL_Complex8 *>(vh), &k, reinterpret_cast<MKL_Complex8 *>(room.work), &room.work_size,
         room.real_work, room.integer_work, &info);
  return info;
}

}  // namespace toolkit
