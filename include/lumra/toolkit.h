/* Typed numeric routines on host arrays. SPDX-License-Identifier: MIT
 *
 * Names: qsRFPELTA_<type><Operation>H, with the type letters s (float), d (double), c and z (complex of them); two
 * letters where two inputs differ. For all functions:
 *
 * - Arrays are handles (lumra/host_array.h). A null input handle or block is an empty input. An output is resized by
 *   the host's service (size argument: elements; rows times columns for a matrix), unless it has the count already.
 * - `scratch` handles are workspace: resized as needed and resized to 0 elements whenever the call ends. A null one is
 *   accepted where the options need none (-20999 otherwise). One that is also another array of the call is refused with
 *   -20061.
 * - `slot` is the address of a pointer, null at first, that keeps a transform between calls. One that fits is used
 *   again, any other is replaced, whatever function left it. qsHost_ReleaseTransform frees it. With a null address the
 *   transform lives as long as the call.
 * - On a negative status all outputs are empty (count 0, also where the host refuses that) and scalar results NaN. A
 *   failure after the transform was made leaves the slot empty.
 * - An output may be one of the inputs, unless a function says otherwise; that input is then read from a copy.
 * - A call uses its arrays and its slot alone; any number of calls on different ones may run at once.
 *
 * Codes, besides 0:
 *    -20001  an array cannot be resized or is too large, an output handle is null, or memory is missing
 *    -20003  an input has no element
 *    -20008  the lengths leave no output
 *    -20061  an option is outside its range, or scratch is shared
 *    -20999  a scratch handle that is needed is null
 *   -359501  a transform could not be computed
 *   -359502  a transform could not be made, or has more than 2^27 points
 *   -359503  the transform in the slot could not be freed */
#ifndef LUMRA_TOOLKIT_H
#define LUMRA_TOOLKIT_H

#include <lumra/export.h>
#include <lumra/host_array.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Discrete Fourier transform:  Y[k] = sum over n of x[n] exp(-2 pi i k n / N),  n and k = 0 .. N - 1.
 *
 * in       samples; as many as there are, at most N of them
 * out      resized to N bins; all of them, for real samples too
 * size     N, at most 2^27; below 1: the number of samples. A larger one pads with zeros
 * shift    not 0: bin 0 comes to index floor(N / 2), negative frequencies in front of it
 * scratch  needed when N is above the number of samples (N elements)
 * slot     real or complex transform of N points, not scaled
 *
 * Codes in the order of the checks: -20003, -359502 (N too large), -20061, -20001, -20999, -359502 or -359503 (slot),
 * -359501. */
LUMRA_EXPORT int32_t qsRFPELTA_s1DFFTH(lumra_f32_array in, lumra_cf32_array out, int32_t size, int32_t shift,
                                       lumra_f32_array scratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_d1DFFTH(lumra_f64_array in, lumra_cf64_array out, int32_t size, int32_t shift,
                                       lumra_f64_array scratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_c1DFFTH(lumra_cf32_array in, lumra_cf32_array out, int32_t size, int32_t shift,
                                       lumra_cf32_array scratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_z1DFFTH(lumra_cf64_array in, lumra_cf64_array out, int32_t size, int32_t shift,
                                       lumra_cf64_array scratch, void **slot);

/* Inverse transform:  x[n] = 1/N sum over k of Y[k] exp(2 pi i k n / N),  N the number of bins.
 *
 * spectrum  N bins, at most 2^27. Into a real record only bins 0 .. floor(N / 2) are read, the others taken as their
 *           conjugates, and the imaginary parts of bin 0 and, for even N, bin N / 2 as zero
 * out       resized to N samples
 * shift     not 0: the spectrum has bin 0 at index floor(N / 2)
 * scratch   needed with shift (floor(N / 2) + 1 elements for a real record, N for a complex one)
 * slot      real or complex transform of N points, scaled backwards by 1/N
 *
 * Codes as above. */
LUMRA_EXPORT int32_t qsRFPELTA_s1DInvFFTH(lumra_cf32_array spectrum, lumra_f32_array out, int32_t shift,
                                          lumra_cf32_array scratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_d1DInvFFTH(lumra_cf64_array spectrum, lumra_f64_array out, int32_t shift,
                                          lumra_cf64_array scratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_c1DInvFFTH(lumra_cf32_array spectrum, lumra_cf32_array out, int32_t shift,
                                          lumra_cf32_array scratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_z1DInvFFTH(lumra_cf64_array spectrum, lumra_cf64_array out, int32_t shift,
                                          lumra_cf64_array scratch, void **slot);

#ifdef __cplusplus
}
#endif

#endif
