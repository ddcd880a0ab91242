/* Typed numeric routines on host arrays. SPDX-License-Identifier: MIT
 *
 * Names: qsRFPELTA_<type><Operation>H, with the type letters s (float), d (double), c and z (complex of them); two
 * letters where two inputs differ. For all functions:
 *
 * - Arrays are handles (lumra/host_array.h). A null input handle or block is an empty input. An output is resized by
 *   the host's service (size argument: elements; rows times columns for a matrix), unless it has the count already.
 * - `scratch` handles are workspace: resized as needed and resized to 0 elements whenever the call ends. A null one is
 *   accepted where the options need none (-20999 otherwise). One that is also another array of the call, by its handle
 *   or by its block, is refused with -20061, needed or not, and is emptied, too.
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
 *    -20002  lengths that must agree differ
 *    -20003  an input has no element
 *    -20004  a size of a matrix is negative
 *    -20006  too few points for a line
 *    -20008  the lengths leave no output, or a filter has reverse coefficients alone
 *    -20016  a resampling ratio is not above 0, or above 2^30
 *    -20022  a decimation factor is below 1 or above the number of samples
 *    -20039  the inner sizes of a product differ
 *    -20059  a resampling delay is negative, or a resampler's state is not one
 *    -20061  an option is outside its range, or scratch is shared
 *    -20068  values are not finite, or an iteration does not converge
 *    -20075  a resampling filter has more taps than its history
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

/* Linear convolution:  r[i] = sum over j of x[j] y[i - j],  i = 0 .. nx + ny - 2.
 *
 * x, y              records; the same array twice is allowed
 * out               resized to the part that mode keeps
 * mode              0: all nx + ny - 1 samples; 1: nx samples from index floor(ny / 2); 2: the nx - ny + 1 samples to
 *                   which all of y contributes, from index ny - 1
 * method            0: directly; 1: through Fourier transforms
 * blockSize         samples of the longer record at a time in the direct method; below 1: 100000. The result does not
 *                   depend on it
 * scratch           needed in modes 1 and 2 (nx + ny - 1 elements)
 * transformScratch  needed by method 1
 * slot              used by method 1: transform of the smallest length from nx + ny - 1 on without prime factors above
 *                   7, scaled backwards by 1/N
 *
 * Codes in the order of the checks: -20003, -20061 (method, then mode), -20008 (mode 2 with nx < ny), -20001 (more
 * than 2^31 - 1 samples), -359502 (too long to transform), -20061 (shared scratch), -20001, -20999, -359503, -359502,
 * -359501. */
LUMRA_EXPORT int32_t qsRFPELTA_s1DConvolutionH(lumra_f32_array x, lumra_f32_array y, lumra_f32_array out, int32_t mode,
                                               int32_t method, int32_t blockSize, lumra_f32_array scratch,
                                               lumra_f32_array transformScratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_d1DConvolutionH(lumra_f64_array x, lumra_f64_array y, lumra_f64_array out, int32_t mode,
                                               int32_t method, int32_t blockSize, lumra_f64_array scratch,
                                               lumra_f64_array transformScratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_c1DConvolutionH(lumra_cf32_array x, lumra_cf32_array y, lumra_cf32_array out,
                                               int32_t mode, int32_t method, int32_t blockSize,
                                               lumra_cf32_array scratch, lumra_cf32_array transformScratch,
                                               void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_z1DConvolutionH(lumra_cf64_array x, lumra_cf64_array y, lumra_cf64_array out,
                                               int32_t mode, int32_t method, int32_t blockSize,
                                               lumra_cf64_array scratch, lumra_cf64_array transformScratch,
                                               void **slot);

/* Cross-correlation:  r[i] = sum over j of conj(x[j]) y[j + i - (nx - 1)],  i = 0 .. nx + ny - 2; lag 0 is at nx - 1.
 * With one real and one complex record the real one counts as complex.
 *
 * x, y              records; the same array twice is allowed
 * out               resized to nx + ny - 1 lags
 * method            0: directly; 1: through Fourier transforms
 * normalisation     0: none; 1 (unbiased): each lag divided by the number of its products, min(nx, ny) at most;
 *                   2 (biased): all divided by max(nx, ny)
 * blockSize         as in the convolution
 * scratch           needed by method 0 (nx + ny elements at most)
 * transformScratch  needed by method 1
 * slot              as in the convolution
 *
 * Codes in the order of the checks: -20003, -20061 (method, then normalisation), -20001 (more than 2^31 - 1 lags),
 * -359502 (too long to transform), -20061 (shared scratch), -20001, -20999, -359503, -359502, -359501. */
LUMRA_EXPORT int32_t qsRFPELTA_s1DCorrelationH(lumra_f32_array x, lumra_f32_array y, lumra_f32_array out,
                                               int32_t method, int32_t normalisation, int32_t blockSize,
                                               lumra_f32_array scratch, lumra_f32_array transformScratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_d1DCorrelationH(lumra_f64_array x, lumra_f64_array y, lumra_f64_array out,
                                               int32_t method, int32_t normalisation, int32_t blockSize,
                                               lumra_f64_array scratch, lumra_f64_array transformScratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_c1DCorrelationH(lumra_cf32_array x, lumra_cf32_array y, lumra_cf32_array out,
                                               int32_t method, int32_t normalisation, int32_t blockSize,
                                               lumra_cf32_array scratch, lumra_cf32_array transformScratch,
                                               void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_z1DCorrelationH(lumra_cf64_array x, lumra_cf64_array y, lumra_cf64_array out,
                                               int32_t method, int32_t normalisation, int32_t blockSize,
                                               lumra_cf64_array scratch, lumra_cf64_array transformScratch,
                                               void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_sc1DCorrelationH(lumra_f32_array x, lumra_cf32_array y, lumra_cf32_array out,
                                                int32_t method, int32_t normalisation, int32_t blockSize,
                                                lumra_cf32_array scratch, lumra_cf32_array transformScratch,
                                                void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_cs1DCorrelationH(lumra_cf32_array x, lumra_f32_array y, lumra_cf32_array out,
                                                int32_t method, int32_t normalisation, int32_t blockSize,
                                                lumra_cf32_array scratch, lumra_cf32_array transformScratch,
                                                void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_dz1DCorrelationH(lumra_f64_array x, lumra_cf64_array y, lumra_cf64_array out,
                                                int32_t method, int32_t normalisation, int32_t blockSize,
                                                lumra_cf64_array scratch, lumra_cf64_array transformScratch,
                                                void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_zd1DCorrelationH(lumra_cf64_array x, lumra_f64_array y, lumra_cf64_array out,
                                                int32_t method, int32_t normalisation, int32_t blockSize,
                                                lumra_cf64_array scratch, lumra_cf64_array transformScratch,
                                                void **slot);

/* Cross-correlation of matrices:
 *   r[i, j] = sum over k, l of conj(x[k, l]) y[k + i - (rows_x - 1), l + j - (columns_x - 1)]
 *
 * x, y              matrices; the same one twice is allowed
 * out               resized to rows_x + rows_y - 1 rows and columns_x + columns_y - 1 columns; the numbers of
 *                   significant bits of rows - 1 and columns - 1 must be below 31 together
 * method            0: directly; 1: through Fourier transforms
 * scratch           vector, needed by method 0 (as many elements as x)
 * transformScratch  vector, needed by method 1
 * slot              used by method 1: two-dimensional transform, each side the smallest length from that of the result
 *                   on without prime factors above 7
 *
 * Codes in the order of the checks: -20003, -20061 (method), -20001 (too large), -359502 (more than 2^27 points to
 * transform), -20061 (shared scratch), -20001, -20999, -359503, -359502, -359501. On failure both sizes are 0. */
LUMRA_EXPORT int32_t qsRFPELTA_s2DCorrelationH(lumra_f32_matrix x, lumra_f32_matrix y, lumra_f32_matrix out,
                                               int32_t method, lumra_f32_array scratch,
                                               lumra_f32_array transformScratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_d2DCorrelationH(lumra_f64_matrix x, lumra_f64_matrix y, lumra_f64_matrix out,
                                               int32_t method, lumra_f64_array scratch,
                                               lumra_f64_array transformScratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_c2DCorrelationH(lumra_cf32_matrix x, lumra_cf32_matrix y, lumra_cf32_matrix out,
                                               int32_t method, lumra_cf32_array scratch,
                                               lumra_cf32_array transformScratch, void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_z2DCorrelationH(lumra_cf64_matrix x, lumra_cf64_matrix y, lumra_cf64_matrix out,
                                               int32_t method, lumra_cf64_array scratch,
                                               lumra_cf64_array transformScratch, void **slot);

/* Multiplies a record by a window that is a sum of cosines, in place:
 *   w[i] = 1/d sum over k of (-1)^k a[k] cos(2 pi k i / n),  i = 0 .. n - 1
 * (periodic: of period n), computed in double precision. One sample alone stays as it is, whatever the type.
 *
 * data       n samples, read and written; a failure empties them
 * type       0 rectangular: 1
 *            1 Hann: 0.5, 0.5
 *            2 Hamming: 0.54, 0.46
 *            3 Blackman-Harris, three terms: 0.42323, 0.49755, 0.07922
 *            4 exact Blackman: 7938/18608, 9240/18608, 1430/18608
 *            5 Blackman: 0.42, 0.5, 0.08
 *            6 flat top, five terms: 0.215578948, 0.41663158, 0.277263158, 0.083578947, 0.006947368
 *            7 Blackman-Harris, four terms: 0.35875, 0.48829, 0.14128, 0.01168
 *            8 Blackman-Harris, seven terms: 0.27105140069342415, 0.43329793923448606, 0.21812299954311062,
 *              0.0659254463880309, 0.010811742098372268, 0.0007765848252250934, 1.3887217350903198e-05
 *            9 low sidelobes, five terms: 0.323215218, 0.471492057, 0.17553428, 0.028497078, 0.001261367
 *           11 Blackman-Nuttall: 0.3635819, 0.4891775, 0.1365995, 0.0106411
 * normalise  not 0: d = a[0], otherwise 1
 * scratch    doubles, needed by all types but 0
 *
 * Source of the coefficients: F. J. Harris, Proc. IEEE 66 (1978), 51-83; A. H. Nuttall, IEEE Trans. ASSP 29 (1981),
 * 84-91. Codes in the order of the checks: -20003, -20061 (type), -20061 (shared scratch), -20999, -20001. */
LUMRA_EXPORT int32_t qsRFPELTA_sAllCosWinH(lumra_f32_array data, int32_t type, int32_t normalise,
                                           lumra_f64_array scratch);
LUMRA_EXPORT int32_t qsRFPELTA_dAllCosWinH(lumra_f64_array data, int32_t type, int32_t normalise,
                                           lumra_f64_array scratch);
LUMRA_EXPORT int32_t qsRFPELTA_cAllCosWinH(lumra_cf32_array data, int32_t type, int32_t normalise,
                                           lumra_f64_array scratch);
LUMRA_EXPORT int32_t qsRFPELTA_zAllCosWinH(lumra_cf64_array data, int32_t type, int32_t normalise,
                                           lumra_f64_array scratch);

/* Two-sided power spectrum:  P[k] = |X[k]|^2 / N^2,  X the discrete Fourier transform of all N samples; bin 0 first.
 * The sum over all k is the mean power of the record.
 *
 * in       N samples, at most 2^27
 * out      resized to N values
 * scratch  needed (N + 2 elements)
 * slot     real or complex transform of N points, not scaled
 *
 * Codes in the order of the checks: -20003, -359502 (N too large), -20061 (shared scratch), -20001, -20999, -20001,
 * -359502 or -359503 (slot), -359501. */
LUMRA_EXPORT int32_t qsRFPELTA_sPowerSpectrumH(lumra_f32_array in, lumra_f32_array out, lumra_f32_array scratch,
                                               void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_dPowerSpectrumH(lumra_f64_array in, lumra_f64_array out, lumra_f64_array scratch,
                                               void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_cPowerSpectrumH(lumra_cf32_array in, lumra_f32_array out, lumra_cf32_array scratch,
                                               void **slot);
LUMRA_EXPORT int32_t qsRFPELTA_zPowerSpectrumH(lumra_cf64_array in, lumra_f64_array out, lumra_cf64_array scratch,
                                               void **slot);

#ifdef __cplusplus
}
#endif

#include <lumra/toolkit_iir.h>
#include <lumra/toolkit_matrix.h>
#include <lumra/toolkit_resampling.h>
#include <lumra/toolkit_statistics.h>

#endif
