// The vector utilities over blocks. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/error_vector.h>
#include <lumra/vector_utilities.h>
#include <lumra/host_array.hpp>

#include <complex>
#include <cstddef>
#include <new>
#include <span>
#include <stdexcept>
#include <type_traits>

namespace lumra {

// Vector utilities, as their C functions document them. Outputs are sized by the call.

namespace detail {
/// Throws where a resize was refused, which the C functions do not report.
template <class T>
void sized(const host_array<T> &out, std::size_t count) {
  if (out.size() != count) throw std::bad_alloc();
}
}  // namespace detail

/// out[i] = x[i] / y[i].
inline void divide(const host_array<std::complex<float>> &x, const host_array<std::complex<float>> &y,
                   host_array<std::complex<float>> &out) {
  check(qsRFHS_complex_division_array_by_array(x.get(), y.get(), out.address()));
  detail::sized(out, x.size());
}

/// out[i] = x[i] / v.
inline void divide(const host_array<std::complex<float>> &x, std::complex<float> v,
                   host_array<std::complex<float>> &out) {
  const lumra_cf32 value{v.real(), v.imag()};
  check(qsRFHS_complex_division_array_by_value(x.get(), &value, out.address()));
  detail::sized(out, x.size());
}

inline void magnitude(const host_array<std::complex<float>> &x, host_array<float> &out) {
  check(qsRFHS_complex_magnitude(x.get(), out.address()));
  detail::sized(out, x.size());
}

inline void magnitude_squared(const host_array<std::complex<float>> &x, host_array<float> &out) {
  check(qsRFHS_complex_magnitude_squared(x.get(), out.address()));
  detail::sized(out, x.size());
}

/// out[i] = c[0] + c[1] x[i] + c[2] x[i]^2 ...; with more than 16 real coefficients only part of it, see
/// qsRFHS_ApplyPolynomial.
template <class T>
void polynomial(const host_array<float> &x, const host_array<T> &c, host_array<T> &out) {
  if (!out.get()) out = host_array<T>(0);
  if constexpr (std::is_same_v<T, float>)
    check(qsRFHS_ApplyPolynomial(x.get(), c.get(), out.get()));
  else
    check(qsRFHS_ApplyPolynomialCplx(x.get(), c.get(), out.get(), nullptr));
  detail::sized(out, c.size() == 0 ? 0 : x.size());
}

/// out[i] = a * log2(x[i]) + b, of |x[i]|^2 where x is complex.
template <class T>
void scaled_log2(const host_array<T> &x, host_array<float> &out, float a, float b) {
  if constexpr (std::is_same_v<T, float>)
    check(qsUtilHS_aLog2Plusb_SGL(x.get(), out.address(), a, b));
  else
    check(qsUtilHS_aLog2Plusb_IQ(x.get(), out.address(), a, b));
  detail::sized(out, x.size());
}

struct level {
  float rms;
  float peak;
};

[[nodiscard]] inline level rms_and_peak(const host_array<std::complex<float>> &x) {
  level result{};
  check(qsUtilHS_RMS_IQ_with_peak_calc(x.get(), &result.rms, &result.peak));
  return result;
}

/// out[i] = in[i] * (gain at keys[i]); the table holds a value and a slope for each entry.
inline void lookup(const host_array<float> &keys, const host_array<std::complex<float>> &in,
                   host_array<std::complex<float>> &out, const host_array<std::complex<float>> &table, float start,
                   float step) {
  if (in.size() < keys.size()) throw std::length_error("lookup");
  check(qsUtilHS_LookupTable(keys.get(), in.get(), out.address(), table.get(), start, step));
  detail::sized(out, keys.size());
}

/// Multiplies by a real factor, in place.
inline void scale(std::span<std::complex<float>> x, float factor) {
  check(qsLumraAlgo_scale_cf(reinterpret_cast<lumra_cf32 *>(x.data()), x.size(), factor));
}

}  // namespace lumra
