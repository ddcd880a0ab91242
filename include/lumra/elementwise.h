/* Element by element over plain arrays. SPDX-License-Identifier: MIT
 *
 * The names end in the type of the samples: _f32 and _f64 are real, _cf32 and _cf64 complex. x, y, keys and the like
 * are read, out is written, n is the number of elements of each of them; 0 does nothing, and they may be null then.
 * "In place": out may be one of the named arrays, from the same address on. All other overlaps with out are refused.
 *
 * Every operation is rounded by itself in the type of the samples, so that results are the same on all processors, but
 * for logarithms, whose last bit may differ between models of processors, and polynomials, which say so. Zeros,
 * denormals, infinities and NaNs take part like any other value and are never an error. Squared magnitudes are not
 * scaled: they leave the range where parts exceed 1.8e19 (single precision; 1.3e154 in double), and lose accuracy where
 * both are below 1.1e-19 (1.5e-154).
 *
 * All return 0, or in the order of the checks: LUMRA_OUT_OF_RANGE, LUMRA_NULL_ARGUMENT of each array, from the first
 * argument to the last (a count of more elements than memory can hold; a null address); LUMRA_OVERLAP out. What a
 * function checks before that is said there. Any thread; no other one works for the call, unless the calling thread has
 * allowed it with lumra_elementwise_set_threads. Results have the same bits for any number of threads. */
#ifndef LUMRA_ELEMENTWISE_H
#define LUMRA_ELEMENTWISE_H

#include <lumra/export.h>
#include <lumra/status.h>
#include <lumra/types.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* How many threads the calling thread's element-wise calls may use from now on; other threads' calls are not concerned.
 * Arrays are shared that take about 64 microseconds or more: real powers in single precision from 270,000 elements on,
 * complex polynomials of degree 8 from 14,000.
 *
 * threads  1: the caller's alone, as a thread begins; more: at most so many; 0: as many as pay; to 1024
 *
 * Returns 0, or LUMRA_OUT_OF_RANGE threads. */
LUMRA_EXPORT lumra_status lumra_elementwise_set_threads(uint32_t threads);

/* What the calling thread has set, 1 at first. */
LUMRA_EXPORT uint32_t lumra_elementwise_threads(void);

/* Quotients: out[i] = x[i] / y[i], or x[i] / value. In place: x, y.
 *
 * Complex a / b: r = 1 / |b|^2, then (re(a) re(b) + im(a) im(b)) r and (im(a) re(b) - re(a) im(b)) r. The error is a
 * few units in the last place of the quotient's magnitude, unless |b|^2 leaves the range: where it overflows quotients
 * are 0, where it is 0 they are infinite or NaN (x over 0 gives NaN in both parts). */
LUMRA_EXPORT lumra_status lumra_divide_f32(const float *x, const float *y, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_divide_f64(const double *x, const double *y, double *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_divide_cf32(const lumra_cf32 *x, const lumra_cf32 *y, lumra_cf32 *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_divide_cf64(const lumra_cf64 *x, const lumra_cf64 *y, lumra_cf64 *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_divide_by_value_f32(const float *x, float value, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_divide_by_value_f64(const double *x, double value, double *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_divide_by_value_cf32(const lumra_cf32 *x, lumra_cf32 value, lumra_cf32 *out,
                                                     uint64_t n);
LUMRA_EXPORT lumra_status lumra_divide_by_value_cf64(const lumra_cf64 *x, lumra_cf64 value, lumra_cf64 *out,
                                                     uint64_t n);

/* Products with a real factor: out[i] = x[i] factor. In place: x. */
LUMRA_EXPORT lumra_status lumra_scale_f32(const float *x, float factor, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_scale_f64(const double *x, double factor, double *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_scale_cf32(const lumra_cf32 *x, float factor, lumra_cf32 *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_scale_cf64(const lumra_cf64 *x, double factor, lumra_cf64 *out, uint64_t n);

/* Magnitudes: out[i] = |x[i]|, the square root of the squared magnitude for complex x. In place: x, where it is real.
 */
LUMRA_EXPORT lumra_status lumra_magnitude_f32(const float *x, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_magnitude_f64(const double *x, double *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_magnitude_cf32(const lumra_cf32 *x, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_magnitude_cf64(const lumra_cf64 *x, double *out, uint64_t n);

/* Powers: out[i] = |x[i]|^2 = re^2 + im^2. In place: x, where it is real. */
LUMRA_EXPORT lumra_status lumra_power_f32(const float *x, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_power_f64(const double *x, double *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_power_cf32(const lumra_cf32 *x, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_power_cf64(const lumra_cf64 *x, double *out, uint64_t n);

/* a = LUMRA_DECIBELS, b = 0 gives decibels: of powers with lumra_log2, of samples with lumra_log2_power. */
#define LUMRA_DECIBELS 3.01029995663981195 /* 10 log10(2) */

/* Scaled logarithms of powers that are given: out[i] = a log2(x[i]) + b. In place: x. Zeros of either sign have the
 * logarithm minus infinity, negative values NaN. log2 is within 2 units in its last place, the product and the sum are
 * rounded once each. */
LUMRA_EXPORT lumra_status lumra_log2_f32(const float *x, float a, float b, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_log2_f64(const double *x, double a, double b, double *out, uint64_t n);

/* Scaled logarithms of the powers of samples: out[i] = a log2(|x[i]|^2) + b. Of complex samples the power is rounded,
 * then the same as above; real samples are not squared, 2 a log2(|x[i]|) + b, and have no range to leave. In place: x,
 * where it is real. */
LUMRA_EXPORT lumra_status lumra_log2_power_f32(const float *x, float a, float b, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_log2_power_f64(const double *x, double a, double b, double *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_log2_power_cf32(const lumra_cf32 *x, float a, float b, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_log2_power_cf64(const lumra_cf64 *x, double a, double b, double *out, uint64_t n);

/* Polynomials: out[i] = c[0] + c[1] x[i] + ... + c[m - 1] x[i]^(m - 1), by Horner's scheme from c[m - 1] on. In place:
 * x, where it is of the type of out. "of_real": x is real, c and out are complex.
 *
 * Of real x in single precision each product is added before it is rounded where the processor has fused operations,
 * and rounded first where not: results are the same on all processors that have them, at every place in an array, and
 * within 2 m units of rounding (2^-24) of the sum of the terms' magnitudes.
 *
 * c  m coefficients
 * m  1 or more
 *
 * Returns first: LUMRA_OUT_OF_RANGE m. */
LUMRA_EXPORT lumra_status lumra_polynomial_f32(const float *x, const float *c, uint64_t m, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_polynomial_f64(const double *x, const double *c, uint64_t m, double *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_polynomial_cf32(const lumra_cf32 *x, const lumra_cf32 *c, uint64_t m, lumra_cf32 *out,
                                                uint64_t n);
LUMRA_EXPORT lumra_status lumra_polynomial_cf64(const lumra_cf64 *x, const lumra_cf64 *c, uint64_t m, lumra_cf64 *out,
                                                uint64_t n);
LUMRA_EXPORT lumra_status lumra_polynomial_of_real_cf32(const float *x, const lumra_cf32 *c, uint64_t m,
                                                        lumra_cf32 *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_polynomial_of_real_cf64(const double *x, const lumra_cf64 *c, uint64_t m,
                                                        lumra_cf64 *out, uint64_t n);

/* Samples times gains that are looked up by key and interpolated linearly. Gain k of the table belongs to the key
 * start + k step:
 *
 *   t = (keys[i] - start) (1 / step);  k = t cut towards zero;  f = t - k
 *   g = table[0]                                    for t <= -1, for a NaN and for |t| from 2^31 on, infinity too
 *   g = f (table[k + 1] - table[k]) + table[k]      for k below m - 1; t in (-1, 0) goes on straight below table[0]
 *   g = table[m - 1]                                otherwise
 *   out[i] = g x[i]
 *
 * In place: x.
 *
 * table  m gains
 * m      1 to 2^31 - 1
 * start  finite
 * step   finite, not 0; may be negative
 *
 * Returns first: LUMRA_OUT_OF_RANGE m, start, step. */
LUMRA_EXPORT lumra_status lumra_lookup_cf32(const lumra_cf32 *x, const float *keys, const lumra_cf32 *table, uint64_t m,
                                            float start, float step, lumra_cf32 *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_lookup_cf64(const lumra_cf64 *x, const double *keys, const lumra_cf64 *table,
                                            uint64_t m, double start, double step, lumra_cf64 *out, uint64_t n);

#ifdef __cplusplus
}
#endif

#endif
