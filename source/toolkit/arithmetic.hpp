// Loops and BLAS calls by type. Products are as they are defined, without the recovery of infinities that std::complex
// does. SPDX-License-Identifier: MIT
#pragma once

#include <mkl_cblas.h>

#include <complex>
#include <cstdint>
#include <span>

#include "qsrfhs/vector/kernels/kernels.hpp"

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

/// out[k] = conj(x[n - 1 - k]); x and out share no memory.
inline void reverse_conjugate(const std::complex<float> *x, std::complex<float> *out, std::int64_t n) noexcept {
  qsrfhs::kernels::exact().reverse_conjugate(reinterpret_cast<const float *>(x), reinterpret_cast<float *>(out),
                                             static_cast<std::size_t>(n));
}
template <class T>
void reverse_conjugate(const T *x, T *out, std::int64_t n) noexcept {
  for (std::int64_t k = 0; k < n; ++k) out[k] = conjugate(x[n - 1 - k]);
}

/// a[k] *= b[k]; a and b may be the same.
inline void multiply(std::complex<float> *a, const std::complex<float> *b, std::int64_t n) noexcept {
  qsrfhs::kernels::exact().multiply(reinterpret_cast<const float *>(a), reinterpret_cast<const float *>(b),
                                    reinterpret_cast<float *>(a), static_cast<std::size_t>(n));
}
inline void multiply(std::complex<double> *a, const std::complex<double> *b, std::int64_t n) noexcept {
  for (std::int64_t k = 0; k < n; ++k) a[k] = product(a[k], b[k]);
}

/// out[k] = sum over j, in this order, of taps[j] x[k - j width]; out and x share no memory.
inline void convolve(const float *x, std::span<const float> taps, std::size_t width, std::span<float> out) noexcept {
  qsrfhs::kernels::exact().fir(x, taps.data(), taps.size(), width, out.data(), out.size());
}
inline void convolve(const double *x, std::span<const double> taps, std::size_t width, std::span<double> out) noexcept {
  qsrfhs::kernels::exact().fir_double(x, taps.data(), taps.size(), width, out.data(), out.size());
}

/// out[k] = |x[k]|^2 * factor: the sum in the element's type, the product in double. `mirror`, unless null, receives
/// the same in reverse order.
inline void scaled_power(const std::complex<float> *x, float *out, float *mirror, double factor,
                         std::int64_t n) noexcept {
  qsrfhs::kernels::exact().scaled_power(reinterpret_cast<const float *>(x), out, mirror, factor,
                                        static_cast<std::size_t>(n));
}
inline void scaled_power(const std::complex<double> *x, double *out, double *mirror, double factor,
                         std::int64_t n) noexcept {
  for (std::int64_t k = 0; k < n; ++k) {
    out[k] = (x[k].real() * x[k].real() + x[k].imag() * x[k].imag()) * factor;
    if (mirror) mirror[n - 1 - k] = out[k];
  }
}

}  // namespace toolkit
