/* Recursive filters in direct form. The conventions are those of lumra/toolkit.h, which includes this.
 * SPDX-License-Identifier: MIT */
#ifndef LUMRA_TOOLKIT_IIR_H
#define LUMRA_TOOLKIT_IIR_H

#include <lumra/export.h>
#include <lumra/host_array.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Filters a record in place; consecutive records continue one stream:
 *   y[i] = 1/a[0] (sum over j of b[j] x[i - j]  -  sum over j > 0 of a[j] y[i - j])
 * Type letters: data, then coefficients.
 *
 * data          n samples, read and written; none: 0 is returned and nothing changed
 * reverse       a, na coefficients; none: y is the first sum
 * forward       b, nb coefficients; with neither of them 0 is returned and nothing changed
 * forwardState  resized to nb - 1 samples: the newest inputs, newest first
 * reverseState  resized to na - 1 samples when there are reverse coefficients: the newest outputs, newest first
 * reset         not 0: starts from zero states, as a call does that has to resize one of them
 * scratch       of the coefficients' type: forwardScratch needed with nb > 1 (nb elements, rounded up to a multiple of
 *               4), reverseScratch with na > 1 (4 floor((na + 2) / 4) + 1 elements); coefficientScratch is both of
 *               them. inputScratch, of the data's type, needed with nb > 1 (the smaller of nb - 1 and n elements)
 *
 * The result does not depend on how the stream is cut, bit for bit. Up to 12 reverse coefficients behind a[0], outputs
 * below the normal range of the type are computed in double precision in steps of the smallest number of the type,
 * which takes about twice the time of others. The states must not be another array of the call. On failure the data and
 * both states are emptied.
 *
 * Codes in the order of the checks: -20008 (reverse coefficients alone), -20061 (shared state or scratch), -20001
 * (states), -20999, -20001 (scratch). */
LUMRA_EXPORT int32_t qsRFPELTA_ssIIRDirectFilterH(lumra_f32_array data, lumra_f32_array reverse,
                                                  lumra_f32_array forward, lumra_f32_array forwardState,
                                                  lumra_f32_array reverseState, int32_t reset,
                                                  lumra_f32_array forwardScratch, lumra_f32_array reverseScratch,
                                                  lumra_f32_array inputScratch);
LUMRA_EXPORT int32_t qsRFPELTA_ddIIRDirectFilterH(lumra_f64_array data, lumra_f64_array reverse,
                                                  lumra_f64_array forward, lumra_f64_array forwardState,
                                                  lumra_f64_array reverseState, int32_t reset,
                                                  lumra_f64_array forwardScratch, lumra_f64_array reverseScratch,
                                                  lumra_f64_array inputScratch);
LUMRA_EXPORT int32_t qsRFPELTA_csIIRDirectFilterH(lumra_cf32_array data, lumra_f32_array reverse,
                                                  lumra_f32_array forward, lumra_cf32_array forwardState,
                                                  lumra_cf32_array reverseState, int32_t reset,
                                                  lumra_f32_array forwardScratch, lumra_f32_array reverseScratch,
                                                  lumra_cf32_array inputScratch);
LUMRA_EXPORT int32_t qsRFPELTA_zdIIRDirectFilterH(lumra_cf64_array data, lumra_f64_array reverse,
                                                  lumra_f64_array forward, lumra_cf64_array forwardState,
                                                  lumra_cf64_array reverseState, int32_t reset,
                                                  lumra_f64_array coefficientScratch, lumra_cf64_array inputScratch);

#ifdef __cplusplus
}
#endif

#endif
