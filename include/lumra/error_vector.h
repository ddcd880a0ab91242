/* Error vectors: how two arrays of complex samples differ, element by element. SPDX-License-Identifier: MIT
 *
 * A is the reference and B what is compared with it, both complex matrices; E, a real matrix, receives one value an
 * element, neither normalised nor averaged. Only the numbers of elements (rows * columns in 32 bits) must agree, not
 * the shapes. E is never resized and must share no memory with A and B. Any thread; calls on different E may run at
 * once. */
#ifndef LUMRA_ERROR_VECTOR_H
#define LUMRA_ERROR_VECTOR_H

#include <lumra/export.h>
#include <lumra/host_array.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Accuracy of Intel MKL's vector math, in which the work is done. The bounds are MKL's, in units of the last place. */
enum lumra_accuracy {
  LUMRA_ACCURACY_LOW = 1,                 /* VML_LA: below 4 */
  LUMRA_ACCURACY_HIGH = 2,                /* VML_HA: below 1 */
  LUMRA_ACCURACY_ENHANCED_PERFORMANCE = 3 /* VML_EP: about half of the bits */
};

/* E[i] = |B[i] - A[i]|, E[i] = |B[i]| - |A[i]|, and E[i] = arg(B[i] * conj(A[i])) in radians from -pi to pi.
 *
 * accuracyMode  LUMRA_ACCURACY_*
 *
 * Returns 0; -312401 when A, B or E or the block of one is null, when a size or a number of elements is negative, when
 * the numbers differ, or for another mode; -312498 without memory for intermediate results. E is unchanged then. */
LUMRA_EXPORT int32_t qsLumraAlgo_CalculateEVM2D(lumra_cf32_matrix a, lumra_cf32_matrix b, lumra_f32_matrix e,
                                                int32_t accuracyMode);
LUMRA_EXPORT int32_t qsLumraAlgo_CalculateMagnitudeError2D(lumra_cf32_matrix a, lumra_cf32_matrix b, lumra_f32_matrix e,
                                                           int32_t accuracyMode);
LUMRA_EXPORT int32_t qsLumraAlgo_CalculatePhaseError2D(lumra_cf32_matrix a, lumra_cf32_matrix b, lumra_f32_matrix e,
                                                       int32_t accuracyMode);

/* Multiplies both parts of n complex values by a factor, in place, in single precision.
 * Returns 0; -1 when data is null and n is not 0. */
LUMRA_EXPORT int32_t qsLumraAlgo_scale_cf(lumra_cf32 *data, uint64_t n, float factor);

#ifdef __cplusplus
}
#endif

#endif
