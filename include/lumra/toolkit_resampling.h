/* Decimation by whole factors, resampling by any ratio. The conventions are those of lumra/toolkit.h, which includes
 * this. SPDX-License-Identifier: MIT */
#ifndef LUMRA_TOOLKIT_RESAMPLING_H
#define LUMRA_TOOLKIT_RESAMPLING_H

#include <lumra/export.h>
#include <lumra/host_array.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Keeps one sample of every `factor`, or their mean:
 *   out[k] = in[k factor]   or   1/factor sum over j of in[k factor + j],  j = 0 .. factor - 1
 * Samples behind the last whole group are dropped.
 *
 * in       n samples
 * out      resized to floor(n / factor) samples
 * factor   1 .. n
 * average  not 0: means; the sums are taken in the element's type
 *
 * Codes in the order of the checks: -20003, -20022 (factor), -20001. */
LUMRA_EXPORT int32_t qsRFPELTA_sDecimateH(lumra_f32_array in, lumra_f32_array out, int32_t factor, int32_t average);
LUMRA_EXPORT int32_t qsRFPELTA_dDecimateH(lumra_f64_array in, lumra_f64_array out, int32_t factor, int32_t average);
LUMRA_EXPORT int32_t qsRFPELTA_cDecimateH(lumra_cf32_array in, lumra_cf32_array out, int32_t factor, int32_t average);
LUMRA_EXPORT int32_t qsRFPELTA_zDecimateH(lumra_cf64_array in, lumra_cf64_array out, int32_t factor, int32_t average);

/* What a resampler is reset with. */
typedef struct lumra_resampler_parameters {
  float ratio;           /* input samples per output sample, above 0, at most 2^30 */
  float delay;           /* position of the first output in input samples, 0 or above, below 2^31 */
  int32_t interpolation; /* 1: the nearest coefficient of the prototype; otherwise linear between the two next to it */
} lumra_resampler_parameters;

/* Bytes of the state that a resampler keeps between calls, at any alignment:
 *    0  int32   samples carried over: those from the position on; negative when the position lies ahead
 *    4  uint64  fraction of the position in units of 2^-64
 *   12  int32   interpolation
 *   16  double  fraction of the position, rounded down
 *   24  double  ratio
 *   32  double  input samples so far
 *   40  double  fraction of the delay
 *   48  int32   whole part of the delay */
#define LUMRA_RESAMPLER_STATE_SIZE 52

/* Resamples a stream block by block with a prototype filter:
 *   out[k] = s sum over j of h(c + s (j - p)) x[j],   p = delay + k ratio,   c = (L - 1) / 2,   s = phases / w
 * h is the prototype between its coefficients 0 .. L - 1, x[j] the samples since the reset with zeros in front, and w
 * is 1, or max(ratio, 1) with bandwidth scaling. Coefficients that sum to 1 pass a constant with unit gain. An output
 * is given as soon as all of its samples are there: N samples since the reset give max(0, ceil((N - c / s - delay) /
 * ratio)) outputs, bit for bit the same however they are cut into blocks. Positions are counted in whole units of
 * 2^-64 of a sample, so that they do not drift; the ratio is rounded to such a unit where it is below 2^-41.
 *
 * in                n samples of the stream; several channels: a matrix, one row a channel
 * coefficients      the prototype, L values, symmetric in most cases
 * phases            coefficients per input sample, above 0
 * parameters        read on reset only
 * reset             not 0: a new stream begins, with the parameters
 * bandwidthScaling  not 0: a ratio above 1 stretches the filter, so that it keeps to the lower output rate
 * out               resized to the outputs that this block gives; one row a channel
 * firstOutputTime   receives the position of the first of them in input samples since the reset; null is allowed
 * sampleHistory     state: the newest samples; one row a channel
 * tapHistory        state: room for the taps of one output; its contents are not used
 *                   On reset both histories are resized to
 *                   2 floor((L - 1) max(ratio, 1) / (2 phases)) + 2 elements (a row)
 * state             LUMRA_RESAMPLER_STATE_SIZE bytes
 *
 * Without a reset the arguments but `in` and `out` must be those of the call before. The histories must not be another
 * array of the call. On failure out and both histories are emptied, *firstOutputTime is 0 and the state all zeros, so
 * that the next call must reset.
 *
 * Codes in the order of the checks: -20003 (no samples or coefficients), -20061 (phases; a null state, or null
 * parameters on reset; shared history), -20016 (ratio, given or kept), -20059 (delay; a state that no call has left, or
 * of other histories), -20001, -20075 (more taps than tapHistory holds), -20001. */
LUMRA_EXPORT int32_t qsRFPELTA_sResampleC2CH(lumra_f32_array in, lumra_f32_array coefficients, int32_t phases,
                                             const lumra_resampler_parameters *parameters, int32_t reset,
                                             int32_t bandwidthScaling, lumra_f32_array out, float *firstOutputTime,
                                             lumra_f32_array sampleHistory, lumra_f32_array tapHistory, void *state);
LUMRA_EXPORT int32_t qsRFPELTA_dResampleC2CH(lumra_f64_array in, lumra_f64_array coefficients, int32_t phases,
                                             const lumra_resampler_parameters *parameters, int32_t reset,
                                             int32_t bandwidthScaling, lumra_f64_array out, float *firstOutputTime,
                                             lumra_f64_array sampleHistory, lumra_f64_array tapHistory, void *state);
LUMRA_EXPORT int32_t qsRFPELTA_cResampleC2CH(lumra_cf32_array in, lumra_f32_array coefficients, int32_t phases,
                                             const lumra_resampler_parameters *parameters, int32_t reset,
                                             int32_t bandwidthScaling, lumra_cf32_array out, float *firstOutputTime,
                                             lumra_cf32_array sampleHistory, lumra_f32_array tapHistory, void *state);
LUMRA_EXPORT int32_t qsRFPELTA_zResampleC2CH(lumra_cf64_array in, lumra_f64_array coefficients, int32_t phases,
                                             const lumra_resampler_parameters *parameters, int32_t reset,
                                             int32_t bandwidthScaling, lumra_cf64_array out, float *firstOutputTime,
                                             lumra_cf64_array sampleHistory, lumra_f64_array tapHistory, void *state);
LUMRA_EXPORT int32_t qsRFPELTA_sResampleMultiChC2CH(lumra_f32_matrix in, lumra_f32_array coefficients, int32_t phases,
                                                    const lumra_resampler_parameters *parameters, int32_t reset,
                                                    int32_t bandwidthScaling, lumra_f32_matrix out,
                                                    float *firstOutputTime, lumra_f32_matrix sampleHistory,
                                                    lumra_f32_array tapHistory, void *state);
LUMRA_EXPORT int32_t qsRFPELTA_dResampleMultiChC2CH(lumra_f64_matrix in, lumra_f64_array coefficients, int32_t phases,
                                                    const lumra_resampler_parameters *parameters, int32_t reset,
                                                    int32_t bandwidthScaling, lumra_f64_matrix out,
                                                    float *firstOutputTime, lumra_f64_matrix sampleHistory,
                                                    lumra_f64_array tapHistory, void *state);
LUMRA_EXPORT int32_t qsRFPELTA_cResampleMultiChC2CH(lumra_cf32_matrix in, lumra_f32_array coefficients, int32_t phases,
                                                    const lumra_resampler_parameters *parameters, int32_t reset,
                                                    int32_t bandwidthScaling, lumra_cf32_matrix out,
                                                    float *firstOutputTime, lumra_cf32_matrix sampleHistory,
                                                    lumra_f32_array tapHistory, void *state);
LUMRA_EXPORT int32_t qsRFPELTA_zResampleMultiChC2CH(lumra_cf64_matrix in, lumra_f64_array coefficients, int32_t phases,
                                                    const lumra_resampler_parameters *parameters, int32_t reset,
                                                    int32_t bandwidthScaling, lumra_cf64_matrix out,
                                                    float *firstOutputTime, lumra_cf64_matrix sampleHistory,
                                                    lumra_f64_array tapHistory, void *state);

#ifdef __cplusplus
}
#endif

#endif
