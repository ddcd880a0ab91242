// SPDX-License-Identifier: MIT
#include "signal/elementwise.hpp"

#include <lumra/elementwise.h>

#include <cmath>
#include <complex>
#include <cstdint>
#include <span>

#include "open/door.hpp"
#include "open/option_checks.hpp"

namespace doors {
namespace {

/// Threads that the calling thread's functions may use, 0 as many as pay. In the memory that a thread has from its
/// start: looking it up takes one instruction.
[[gnu::tls_model("initial-exec")]] constinit thread_local std::uint32_t threads = 1;

std::complex<float> sample(lumra_cf32 value) noexcept {
  return {value.re, value.im};
}
std::complex<double> sample(lumra_cf64 value) noexcept {
  return {value.re, value.im};
}
float sample(float value) noexcept {
  return value;
}
double sample(double value) noexcept {
  return value;
}

/// Runs work(x, out) over checked arrays of n elements.
template <class X, class Out, class Work>
lumra_status from_one(const char *function, const X *x, Out *out, std::uint64_t n, Work work) noexcept {
  return enter(function, [&] {
    const auto in = array(samples(x), n, "x");
    const auto to = array(samples(out), n, "out");
    require_same_or_apart(to, "out", in, "x");
    work(in, to);
  });
}

template <class T>
lumra_status divide(const char *function, const T *x, const T *y, T *out, std::uint64_t n) noexcept {
  return enter(function, [&] {
    const auto dividend = array(samples(x), n, "x");
    const auto divisor = array(samples(y), n, "y");
    const auto quotient = array(samples(out), n, "out");
    require_same_or_apart(quotient, "out", dividend, "x");
    require_same_or_apart(quotient, "out", divisor, "y");
    dsp::divide(dividend, divisor, quotient, threads);
  });
}

template <class T>
lumra_status divide_by_value(const char *function, const T *x, T value, T *out, std::uint64_t n) noexcept {
  return from_one(function, x, out, n, [=](auto in, auto to) { dsp::divide_by_value(in, sample(value), to, threads); });
}

template <class T, class Real>
lumra_status scale(const char *function, const T *x, Real factor, T *out, std::uint64_t n) noexcept {
  return from_one(function, x, out, n, [=](auto in, auto to) { dsp::scale(in, factor, to, threads); });
}

template <class T, class Real>
lumra_status magnitude(const char *function, const T *x, Real *out, std::uint64_t n) noexcept {
  return from_one(function, x, out, n, [](auto in, auto to) { dsp::magnitude(in, to, threads); });
}

template <class T, class Real>
lumra_status power(const char *function, const T *x, Real *out, std::uint64_t n) noexcept {
  return from_one(function, x, out, n, [](auto in, auto to) { dsp::power(in, to, threads); });
}

template <class Real>
lumra_status log2(const char *function, const Real *x, Real a, Real b, Real *out, std::uint64_t n) noexcept {
  return from_one(function, x, out, n, [=](auto in, auto to) { dsp::log2(in, a, b, to, threads); });
}

template <class T, class Real>
lumra_status log2_power(const char *function, const T *x, Real a, Real b, Real *out, std::uint64_t n) noexcept {
  return from_one(function, x, out, n, [=](auto in, auto to) { dsp::log2_power(in, a, b, to, threads); });
}

template <class T, class C>
lumra_status polynomial(const char *function, const T *x, const C *c, std::uint64_t m, C *out,
                        std::uint64_t n) noexcept {
  return enter(function, [&] {
    require(m >= 1, LUMRA_OUT_OF_RANGE, "m is 0; a polynomial has at least 1 coefficient");
    const auto in = array(samples(x), n, "x");
    const auto coefficients = array(samples(c), m, "c");
    const auto to = array(samples(out), n, "out");
    require_same_or_apart(to, "out", in, "x");
    require_apart(to, "out", coefficients, "c");
    dsp::polynomial(in, coefficients, to, threads);
  });
}

template <class T, class Real>
lumra_status look_up(const char *function, const T *x, const Real *keys, const T *table, std::uint64_t m, Real start,
                     Real step, T *out, std::uint64_t n) noexcept {
  return enter(function, [&] {
    constexpr std::uint64_t most_gains = 2147483647;
    require(m >= 1 && m <= most_gains, LUMRA_OUT_OF_RANGE, "m is ", m, "; a table has 1 to ", most_gains, " gains");
    require(std::isfinite(start), LUMRA_OUT_OF_RANGE, "start is ", double{start}, "; it is the key of the first gain");
    require(std::isfinite(step) && step != 0, LUMRA_OUT_OF_RANGE, "step is ", double{step},
            "; it is the distance between keys, and not 0");
    const auto in = array(samples(x), n, "x");
    const auto at = array(keys, n, "keys");
    const auto gains = array(samples(table), m, "table");
    const auto to = array(samples(out), n, "out");
    require_same_or_apart(to, "out", in, "x");
    require_apart(to, "out", at, "keys");
    require_apart(to, "out", gains, "table");
    dsp::look_up(in, at, {gains, start, step}, to, threads);
  });
}

}  // namespace
}  // namespace doors

lumra_status lumra_elementwise_set_threads(uint32_t threads) {
  return doors::enter(__func__, [&] {
    doors::require_threads(threads, "threads");
    doors::threads = threads;
  });
}

uint32_t lumra_elementwise_threads(void) {
  return doors::threads;
}

lumra_status lumra_divide_f32(const float *x, const float *y, float *out, uint64_t n) {
  return doors::divide(__func__, x, y, out, n);
}

lumra_status lumra_divide_f64(const double *x, const double *y, double *out, uint64_t n) {
  return doors::divide(__func__, x, y, out, n);
}

lumra_status lumra_divide_cf32(const lumra_cf32 *x, const lumra_cf32 *y, lumra_cf32 *out, uint64_t n) {
  return doors::divide(__func__, x, y, out, n);
}

lumra_status lumra_divide_cf64(const lumra_cf64 *x, const lumra_cf64 *y, lumra_cf64 *out, uint64_t n) {
  return doors::divide(__func__, x, y, out, n);
}

lumra_status lumra_divide_by_value_f32(const float *x, float value, float *out, uint64_t n) {
  return doors::divide_by_value(__func__, x, value, out, n);
}

lumra_status lumra_divide_by_value_f64(const double *x, double value, double *out, uint64_t n) {
  return doors::divide_by_value(__func__, x, value, out, n);
}

lumra_status lumra_divide_by_value_cf32(const lumra_cf32 *x, lumra_cf32 value, lumra_cf32 *out, uint64_t n) {
  return doors::divide_by_value(__func__, x, value, out, n);
}

lumra_status lumra_divide_by_value_cf64(const lumra_cf64 *x, lumra_cf64 value, lumra_cf64 *out, uint64_t n) {
  return doors::divide_by_value(__func__, x, value, out, n);
}

lumra_status lumra_scale_f32(const float *x, float factor, float *out, uint64_t n) {
  return doors::scale(__func__, x, factor, out, n);
}

lumra_status lumra_scale_f64(const double *x, double factor, double *out, uint64_t n) {
  return doors::scale(__func__, x, factor, out, n);
}

lumra_status lumra_scale_cf32(const lumra_cf32 *x, float factor, lumra_cf32 *out, uint64_t n) {
  return doors::scale(__func__, x, factor, out, n);
}

lumra_status lumra_scale_cf64(const lumra_cf64 *x, double factor, lumra_cf64 *out, uint64_t n) {
  return doors::scale(__func__, x, factor, out, n);
}

lumra_status lumra_magnitude_f32(const float *x, float *out, uint64_t n) {
  return doors::magnitude(__func__, x, out, n);
}

lumra_status lumra_magnitude_f64(const double *x, double *out, uint64_t n) {
  return doors::magnitude(__func__, x, out, n);
}

lumra_status lumra_magnitude_cf32(const lumra_cf32 *x, float *out, uint64_t n) {
  return doors::magnitude(__func__, x, out, n);
}

lumra_status lumra_magnitude_cf64(const lumra_cf64 *x, double *out, uint64_t n) {
  return doors::magnitude(__func__, x, out, n);
}

lumra_status lumra_power_f32(const float *x, float *out, uint64_t n) {
  return doors::power(__func__, x, out, n);
}

lumra_status lumra_power_f64(const double *x, double *out, uint64_t n) {
  return doors::power(__func__, x, out, n);
}

lumra_status lumra_power_cf32(const lumra_cf32 *x, float *out, uint64_t n) {
  return doors::power(__func__, x, out, n);
}

lumra_status lumra_power_cf64(const lumra_cf64 *x, double *out, uint64_t n) {
  return doors::power(__func__, x, out, n);
}

lumra_status lumra_log2_f32(const float *x, float a, float b, float *out, uint64_t n) {
  return doors::log2(__func__, x, a, b, out, n);
}

lumra_status lumra_log2_f64(const double *x, double a, double b, double *out, uint64_t n) {
  return doors::log2(__func__, x, a, b, out, n);
}

lumra_status lumra_log2_power_f32(const float *x, float a, float b, float *out, uint64_t n) {
  return doors::log2_power(__func__, x, a, b, out, n);
}

lumra_status lumra_log2_power_f64(const double *x, double a, double b, double *out, uint64_t n) {
  return doors::log2_power(__func__, x, a, b, out, n);
}

lumra_status lumra_log2_power_cf32(const lumra_cf32 *x, float a, float b, float *out, uint64_t n) {
  return doors::log2_power(__func__, x, a, b, out, n);
}

lumra_status lumra_log2_power_cf64(const lumra_cf64 *x, double a, double b, double *out, uint64_t n) {
  return doors::log2_power(__func__, x, a, b, out, n);
}

lumra_status lumra_polynomial_f32(const float *x, const float *c, uint64_t m, float *out, uint64_t n) {
  return doors::polynomial(__func__, x, c, m, out, n);
}

lumra_status lumra_polynomial_f64(const double *x, const double *c, uint64_t m, double *out, uint64_t n) {
  return doors::polynomial(__func__, x, c, m, out, n);
}

lumra_status lumra_polynomial_cf32(const lumra_cf32 *x, const lumra_cf32 *c, uint64_t m, lumra_cf32 *out, uint64_t n) {
  return doors::polynomial(__func__, x, c, m, out, n);
}

lumra_status lumra_polynomial_cf64(const lumra_cf64 *x, const lumra_cf64 *c, uint64_t m, lumra_cf64 *out, uint64_t n) {
  return doors::polynomial(__func__, x, c, m, out, n);
}

lumra_status lumra_polynomial_of_real_cf32(const float *x, const lumra_cf32 *c, uint64_t m, lumra_cf32 *out,
                                           uint64_t n) {
  return doors::polynomial(__func__, x, c, m, out, n);
}

lumra_status lumra_polynomial_of_real_cf64(const double *x, const lumra_cf64 *c, uint64_t m, lumra_cf64 *out,
                                           uint64_t n) {
  return doors::polynomial(__func__, x, c, m, out, n);
}

lumra_status lumra_lookup_cf32(const lumra_cf32 *x, const float *keys, const lumra_cf32 *table, uint64_t m, float start,
                               float step, lumra_cf32 *out, uint64_t n) {
  return doors::look_up(__func__, x, keys, table, m, start, step, out, n);
}

lumra_status lumra_lookup_cf64(const lumra_cf64 *x, const double *keys, const lumra_cf64 *table, uint64_t m,
                               double start, double step, lumra_cf64 *out, uint64_t n) {
  return doors::look_up(__func__, x, keys, table, m, start, step, out, n);
}
