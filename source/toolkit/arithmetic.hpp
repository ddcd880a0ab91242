// Products as they are defined, without the recovery of infinities that std::complex does, and BLAS by type.
// SPDX-License-Identifier: MIT
#pragma once

#include <mkl_cblas.h>

#include <complex>
#include <cstdint>

namespace toolkit {

inline float product(float a, float b) noexcept {
  return a * b;
}
inline double product(double a, double b) noexcept {
  return a * b;
}
template <class Real>
std::complex<Real> product(std::complex<Real> a, std::complex<Real> b) noexcept {
  return {a.real() * b.real() - a.imag() * b.imag(), a.real() * b.imag() + a.imag() * b.real()};
}

inline float conjugate(float a) noexcept {
  return a;
}
inline double conjugate(double a) noexcept {
  return a;
}
template <class Real>
std::complex<Real> conjugate(std::complex<Real> a) noexcept {
  return std::conj(a);
}

/// y += a x
inline void axpy(std::int32_t n, float a, const float *x, float *y) noexcept {
  cblas_saxpy(n, a, x, 1, y, 1);
}
inline void axpy(std::int32_t n, double a, const double *x, double *y) noexcept {
  cblas_daxpy(n, a, x, 1, y, 1);
}
inline void axpy(std::int32_t n, std::complex<float> a, const std::complex<float> *x, std::complex<float> *y) noexcept {
  cblas_caxpy(n, &a, x, 1, y, 1);
}
inline void axpy(std::int32_t n, std::complex<double> a, const std::complex<double> *x,
                 std::complex<double> *y) noexcept {
  cblas_zaxpy(n, &a, x, 1, y, 1);
}

/// x *= a
inline void scale(std::int32_t n, float a, float *x) noexcept {
  cblas_sscal(n, a, x, 1);
}
inline void scale(std::int32_t n, double a, double *x) noexcept {
  cblas_dscal(n, a, x, 1);
}
inline void scale(std::int32_t n, float a, std::complex<float> *x) noexcept {
  cblas_csscal(n, a, x, 1);
}
inline void scale(std::int32_t n, double a, std::complex<double> *x) noexcept {
  cblas_zdscal(n, a, x, 1);
}

}  // namespace toolkit
