/* Sessions: windowed FFTs with I/Q power spectra, and the log of what failed. SPDX-License-Identifier: MIT
 *
 * A session keeps what makes repeated measurements cheap (transforms and windows ready for use) and a log. Any
 * function may be called from any thread at any time, also on one session by several threads; closing a session while
 * calls work on it is safe, they finish on their own reference.
 *
 * Checks run in the order in which codes are listed. A failure behind the checks leaves an entry in the session's log
 * and returns LUMRA_INTERNAL_ERROR, or LUMRA_INVALID_ARGUMENT for a size that cannot be served; the session stays
 * usable. Names: N is the FFT size, fs = 1 / dt the sample rate. */
#ifndef LUMRA_SESSION_H
#define LUMRA_SESSION_H

#include <lumra/export.h>
#include <lumra/host_array.h>
#include <lumra/status.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Windows. The stored coefficients carry an alternating sign, w[n] * (-1)^n, which puts zero frequency into the middle
 * of the spectrum (for even N). */
enum lumra_window {
  LUMRA_WINDOW_NONE = 0,    /* all ones */
  LUMRA_WINDOW_FLAT_TOP = 1 /* five-term periodic flat top */
};

/* A complex baseband record. */
typedef struct lumra_waveform {
  double t0;          /* start time in seconds; not used */
  double dt;          /* sample interval in seconds; not checked: 0 makes f0 and df infinite */
  lumra_cf32_array y; /* samples; the count is read as unsigned */
} lumra_waveform;

/* A power spectrum. */
typedef struct lumra_spectrum {
  double f0;         /* frequency of bin 0 in hertz: -fs / 2 */
  double df;         /* bin spacing in hertz: fs / N */
  lumra_f32_array y; /* linear power of each bin, in units of the input squared */
} lumra_spectrum;

/* Opens a session and writes its handle. Handles count from 1 and are never used again.
 * Returns 0; LUMRA_INVALID_ARGUMENT when session is null; LUMRA_INTERNAL_ERROR when memory or threads are missing
 * (*session is unchanged then). */
LUMRA_EXPORT int32_t qsLumraAlgo_CreateSession(uint64_t *session);

/* Closes a session and its log: readers that wait return LUMRA_INTERNAL_ERROR. Calls that are running finish. An
 * unknown handle is no error. Returns 0. */
LUMRA_EXPORT int32_t qsLumraAlgo_CloseSession(uint64_t session);

/* Drops the session's transforms and windows; handle and log stay.
 * Returns 0; LUMRA_INVALID_SESSION; LUMRA_INTERNAL_ERROR. */
LUMRA_EXPORT int32_t qsLumraAlgo_ResetSession(uint64_t session);

/* Takes the oldest entry out of the session's log as text: "source:line message".
 *
 * timeout     must be 0.0, which waits until an entry is there or the session is closed; no timed wait exists
 * buffer      receives at most bufferSize - 1 characters and a NUL; the entry is consumed whatever its length
 * bufferSize  in bytes; 0: nothing is written, the entry is consumed
 *
 * Returns 0; LUMRA_INVALID_ARGUMENT when buffer is null; LUMRA_INVALID_SESSION; LUMRA_INTERNAL_ERROR for another
 * timeout (nothing is read) or a log that was closed. The log keeps the newest 10001 entries. */
LUMRA_EXPORT int32_t qsLumraAlgo_ReadLog(uint64_t session, double timeout, char *buffer, uint64_t bufferSize);

/* Prepares a transform of fftSize points, so that the first measurement of that size need not.
 * fftSize: 16 to 2^27. Returns 0; LUMRA_FFT_SIZE_TOO_SMALL; LUMRA_INVALID_SESSION; LUMRA_INVALID_ARGUMENT above
 * 2^27; LUMRA_INTERNAL_ERROR. */
LUMRA_EXPORT int32_t qsLumraAlgo_InitializeFFT(uint64_t session, int32_t fftSize);

/* Prepares a window of fftSize coefficients. Measurements use a window only when it was prepared for their size.
 * For x = 2 pi n / N the flat top is
 *   w[n] = 0.21557895 - 0.41663158 cos x + 0.277263158 cos 2x - 0.083578947 cos 3x + 0.006947368 cos 4x
 * (D'Antona and Ferrero, Digital Signal Processing for Measurement Systems, 2006), computed in double precision; it is
 * not normalised: its coherent gain is 0.21557895 * N.
 *
 * windowType  LUMRA_WINDOW_*; any other value is accepted and stands for no window and no alternating sign
 * fftSize     16 to 2^27
 *
 * Returns 0; LUMRA_FFT_SIZE_TOO_SMALL; LUMRA_INVALID_SESSION; LUMRA_INVALID_ARGUMENT for a window above 2^27;
 * LUMRA_INTERNAL_ERROR. A window that is there already stays. */
LUMRA_EXPORT int32_t qsLumraAlgo_InitializeWindow(uint64_t session, uint32_t windowType, int32_t fftSize);

/* Averages the power spectra of overlapping segments of a record.
 *
 *   O = overlapPercent / 100 * N, truncated;  S = N - O;  K = floor((count - N) / S) + 1
 *   Y[k] = 1/K * sum over the K segments of |FFT(w * x[segment])[k]|^2      (unscaled transform, single precision)
 *
 * With a window prepared, bin k lies at f0 + k * df: negative frequencies first, zero in bin N / 2. Without one the
 * bins keep the order of the transform (zero frequency in bin 0), while f0 and df are written the same way. Samples
 * behind the last whole segment are ignored. A tone of amplitude A on a bin gives (A * N)^2 with LUMRA_WINDOW_NONE.
 *
 * windowType      LUMRA_WINDOW_*
 * fftSize         N, 16 to 2^27
 * overlapPercent  at least 0 and below 100
 * in              record, read; a null handle or block counts as no samples; NaN and infinity propagate
 * out             y is resized to N elements unless it has N already (type code 9, one dimension, size N * 4; a null
 *                 handle is made by the resize); f0 and df are written on success only. A refused resize is no
 *                 error: y keeps its count and receives no more bins than that
 *
 * Returns 0; LUMRA_INVALID_ARGUMENT when in or out is null; LUMRA_FFT_SIZE_TOO_SMALL; LUMRA_INVALID_SESSION;
 * LUMRA_INVALID_OVERLAP; LUMRA_INPUT_TOO_SHORT; LUMRA_INVALID_ARGUMENT for N above 2^27; LUMRA_INTERNAL_ERROR.
 * in and out must not share memory. Calls on different outputs may run at once. */
LUMRA_EXPORT int32_t qsLumraAlgo_PerformWindowingOverlappedSeqFFTAndIQTransform(uint64_t session, int32_t windowType,
                                                                                int32_t fftSize, double overlapPercent,
                                                                                const lumra_waveform *in,
                                                                                lumra_spectrum *out);

/* The same with an overlap of 0: segments that follow each other. */
LUMRA_EXPORT int32_t qsLumraAlgo_PerformWindowingFFTAndIQTransform(uint64_t session, int32_t windowType,
                                                                   int32_t fftSize, const lumra_waveform *in,
                                                                   lumra_spectrum *out);

#ifdef __cplusplus
}
#endif

#endif
