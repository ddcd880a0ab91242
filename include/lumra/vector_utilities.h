/* Vector utilities: element by element over one-dimensional host arrays. SPDX-License-Identifier: MIT
 *
 * Arithmetic is IEEE single precision, every operation rounded by itself, in the order that the formulas show; no
 * operation is fused. Zeros, denormals, infinities and NaNs take part in it like any other value and are never an
 * error. A NaN may come out with either sign and any payload. Results do not depend on the processor, on the alignment
 * of the arrays or on the length, but for three cases that name the two builds of the loops: one for processors with
 * AVX and one, called baseline, for all others. Which one runs is decided once for the process;
 * qsLumraAlgo_hasAvxHardwareSupport tells.
 *
 * x, y and the like are handles that are read; `out` is the address of a handle that is written, unless its function
 * says otherwise. n is the number of results. A negative count reads as 0.
 *
 * Sizing: an output whose count is at least n gets the count n and keeps its block. Any other, a null block or a null
 * handle too, is resized (size argument n * 8 for complex, n * 4 for real elements) and then gets the count n. A
 * refused resize is not reported: the call returns as if it had succeeded, the count stays, and the results that fit
 * into the old count are written.
 *
 * An output may be one of the inputs unless its function says otherwise. Nothing is written, and no handle touched,
 * when a code other than 0 is returned. Any thread; calls that run at once must not write the same array, and no handle
 * in use may be resized or freed. Codes are listed in the order of the checks; "recorded" ones are appended to the list
 * that qsrfhs_getErrors gives. */
#ifndef LUMRA_VECTOR_UTILITIES_H
#define LUMRA_VECTOR_UTILITIES_H

#include <lumra/export.h>
#include <lumra/host_array.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Complex division: out[i] = x[i] / y[i] or x[i] / v, n = count of x.
 *
 *   d = br * br + bi * bi;  r = 1 / d;  re = (ar * br + ai * bi) * r;  im = (ai * br - ar * bi) * r
 *
 * for a = x[i], b = y[i] or v. The divisor is not scaled: where its squared magnitude overflows, r is 0; where it
 * underflows, and for a divisor of 0, r is infinite (a finite dividend over 0 gives NaN in both parts). The functions
 * named "assignment" write x in place.
 *
 * y    n elements or more; those behind are ignored
 * v    one value, which may lie in any of the arrays
 *
 * Returns 0, or one of these codes, recorded:
 *                                   by array     assignment   by value     assignment by value
 *   x or its block null             -83951665    -83951703    -83951730    -83951766
 *   y or its block null; v null     -83951668    -83951706    -83951733    -83951769
 *   out null                        -83951671                 -83951736
 *   x longer than y                 -83951676    -83951711 */
LUMRA_EXPORT int32_t qsRFHS_complex_division_array_by_array(lumra_cf32_array x, lumra_cf32_array y,
                                                            lumra_cf32_array *out);
LUMRA_EXPORT int32_t qsRFHS_complex_division_assignment_array_by_array(lumra_cf32_array x, lumra_cf32_array y);
LUMRA_EXPORT int32_t qsRFHS_complex_division_array_by_value(lumra_cf32_array x, const lumra_cf32 *v,
                                                            lumra_cf32_array *out);
LUMRA_EXPORT int32_t qsRFHS_complex_division_assignment_array_by_value(lumra_cf32_array x, const lumra_cf32 *v);

/* Magnitudes: out[i] = sqrt(re * re + im * im), and the same without the root; n = count of x. Not scaled: parts above
 * about 1.8e19 give infinity.
 *
 * Returns 0, or one of these codes, recorded (magnitude, squared):
 *   x or its block null   -83951791    -83951822
 *   out null              -83951794    -83951825 */
LUMRA_EXPORT int32_t qsRFHS_complex_magnitude(lumra_cf32_array x, lumra_f32_array *out);
LUMRA_EXPORT int32_t qsRFHS_complex_magnitude_squared(lumra_cf32_array x, lumra_f32_array *out);

/* Polynomial: output[i] = c[0] + c[1] x[i] + ... + c[m - 1] x[i]^(m - 1), n = count of x, m = count of the
 * coefficients, by Horner's scheme: acc = c[m - 1], then acc = acc * x + c[k] for k from m - 2 down to 0. With complex
 * coefficients the two parts run side by side.
 *
 * With many real coefficients only some of the samples, from the first, are evaluated, and the others keep what the
 * output held. In the baseline build that is so from 17 coefficients on: n mod 16 samples are evaluated. In the AVX
 * build from 33 on: those in front of the first element of the output that lies on a boundary of 32 bytes (at most 7),
 * and of the r samples from there on r mod 16. Complex coefficients have no such limit.
 *
 * x               real; a null handle or block counts as empty
 * coefficients    as x; may be the output too
 * output          a handle, not its address. One of another count than n, larger or smaller, is resized to n (size
 *                 argument n * 4, complex n * 8); n = 0 or m = 0 makes it empty. A refused resize is not reported: the
 *                 count stays and results are written as far as it goes. A null handle receives nothing. With
 *                 complex coefficients it must not be x (nothing is evaluated then)
 * elapsedSeconds  receives the time that sizing and evaluation took, except for n = 0 or m = 0; may be null
 *
 * Returns 0 always. */
LUMRA_EXPORT int32_t qsRFHS_ApplyPolynomial(lumra_f32_array x, lumra_f32_array coefficients, lumra_f32_array output);
LUMRA_EXPORT int32_t qsRFHS_ApplyPolynomialCplx(lumra_f32_array x, lumra_cf32_array coefficients,
                                                lumra_cf32_array output, float *elapsedSeconds);

/* Scaled logarithms: a * L(v) + b, where L approximates log2 with an error below 6e-5; n = count of x, a null handle or
 * block counts as empty. a = 3.0103 gives decibels of powers, a = 6.0206 those of voltages.
 *
 *   v = m * 2^(e - 127), m in [1, 2), both taken from the bits of v without its sign
 *   p = ((((0.04343 m - 0.404873) m + 1.59392) m - 3.492526) m + 5.046902) m
 *   L = p - 2.786821 - 127 + e          constants: 0x3D31E3A8 0x3ECF4B84 0x3FCC0592 0x405F858C 0x40A18039, 0x40325B46
 *
 * Denormals count as their mantissa with e = 0, infinity as 2^128.
 *
 * qsRFHS_log2_scaled_SGL   in place; a negative value or NaN gives NaN, a zero of either sign a * -126.99997 + b.
 *                          Returns 0 always
 * qsUtilHS_aLog2Plusb_SGL  the same into out, but a zero of either sign gives minus infinity whatever a and b
 * qsUtilHS_aLog2Plusb_IQ   v = re * re + im * im of complex samples; no value is special: zero gives
 *                          a * -126.99997 + b, a NaN what its bits say (a * 128.585 + b for the usual one)
 *
 * The two that write out return 0, or -1 when out is null, not recorded. */
LUMRA_EXPORT int32_t qsRFHS_log2_scaled_SGL(lumra_f32_array x, float a, float b);
LUMRA_EXPORT int32_t qsUtilHS_aLog2Plusb_SGL(lumra_f32_array x, lumra_f32_array *out, float a, float b);
LUMRA_EXPORT int32_t qsUtilHS_aLog2Plusb_IQ(lumra_cf32_array x, lumra_f32_array *out, float a, float b);

/* Root mean square of the magnitude of complex samples: sqrt(P / n), P = sum of re^2 + im^2; NaN for no samples.
 *
 * The sum: 32 running sums, one for each float of a block of 16 samples, s[j] += f[j] * f[j]. They are folded, for j
 * from 0 to 7, into (s[24 + j] + s[16 + j]) + (s[8 + j] + s[j]), these eight are added up in order, then the last
 * n mod 16 samples one by one.
 *
 * x    a null handle or block counts as empty
 * rms  receives the result; nothing is done when null
 *
 * Returns 0 always. */
LUMRA_EXPORT int32_t qsUtilHS_RMS_IQ(lumra_cf32_array x, float *rms);

/* The same together with the largest magnitude. NaN samples make the RMS NaN and do not count for the peak, which is
 * NaN when there is no other sample.
 *
 * The sum: in the baseline build sample by sample, P += re * re + im * im; in the AVX build as in qsUtilHS_RMS_IQ. The
 * RMS may so differ in its last bits between processors, and in the baseline build from that of qsUtilHS_RMS_IQ.
 *
 * Returns 0, or -1, not recorded, when x, its block, rms or peak is null. */
LUMRA_EXPORT int32_t qsUtilHS_RMS_IQ_with_peak_calc(lumra_cf32_array x, float *rms, float *peak);

/* Multiplies samples by gains that are looked up by key, with linear interpolation; n = count of keys.
 *
 *   t = (key[i] - start) * (1 / step);  k = t cut towards zero;  M = number of entries
 *   g = V[0]                         for k < 0, for a NaN and for t outside of [-2^31, 2^31), +infinity too
 *   g = (t - k) * S[k] + V[k]        for k below M - 1; t in (-1, 0) extrapolates from entry 0
 *   g = V[M - 1]                     otherwise
 *   out[i] = (g.re * in.re - g.im * in.im, g.re * in.im + g.im * in.re)
 *
 * keys         real; a null handle or block counts as empty
 * in           complex, n samples or more: its count is not looked at; a null handle or block counts as no keys
 * out          sized as above; may be in, not keys nor table
 * table        complex, two elements an entry: value V[k], then slope S[k], the change for one step. An odd last
 *              element is ignored; without a whole entry the output is zeros
 * start, step  key of entry 0, distance of the keys; step may be negative or NaN
 *
 * From 65537 samples on, the caller and threads of the library share the work: n / 32768 parts, at most 4, the last of
 * which is the caller's. The threads are started at the first such call and end with the process.
 *
 * Returns 0, or in the order of the checks
 *   -380127    table or its block null, its count 0, or step 0; not recorded
 *   -1         out null; not recorded
 *   -67436764  the threads did not finish within 10 s; recorded. They may still be writing to out then: none of the
 *              arrays may be freed before they have finished. Where threads could not be started, -67436963 is recorded
 *              for each of them too */
LUMRA_EXPORT int32_t qsUtilHS_LookupTable(lumra_f32_array keys, lumra_cf32_array in, lumra_cf32_array *out,
                                          lumra_cf32_array table, float start, float step);

#ifdef __cplusplus
}
#endif

#endif
