/* Windows for spectra and filters. SPDX-License-Identifier: MIT
 *
 * A window is a number of enum lumra_window_type and, for Kaiser's, a parameter; lumra_window_by_name finds both. All
 * are computed in double precision. Conventions of the open interface: lumra/lumra.h. Any thread. */
#ifndef LUMRA_WINDOW_H
#define LUMRA_WINDOW_H

#include <lumra/export.h>
#include <lumra/status.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Sums of cosines, w(x) = sum over k of (-1)^k a[k] cos(2 pi k x), x in [0, 1), by the coefficients a; and Kaiser's.
 * Source: F. J. Harris, Proc. IEEE 66 (1978), 51-83; A. H. Nuttall, IEEE Trans. ASSP 29 (1981), 84-91. */
enum lumra_window_type {
  LUMRA_WINDOW_RECTANGULAR = 0,       /* "boxcar", "rectangular", "none": 1 */
  LUMRA_WINDOW_HANN = 1,              /* "hann": 0.5, 0.5 */
  LUMRA_WINDOW_HAMMING = 2,           /* "hamming": 0.54, 0.46 */
  LUMRA_WINDOW_BLACKMAN_HARRIS_3 = 3, /* "blackmanharris3": 0.42323, 0.49755, 0.07922 */
  LUMRA_WINDOW_EXACT_BLACKMAN = 4,    /* "exact_blackman": 7938/18608, 9240/18608, 1430/18608 */
  LUMRA_WINDOW_BLACKMAN = 5,          /* "blackman": 0.42, 0.5, 0.08 */
  LUMRA_WINDOW_TOOLKIT_FLAT_TOP = 6,  /* "flattop_toolkit": 0.215578948, the others as LUMRA_WINDOW_SESSION_FLAT_TOP */
  LUMRA_WINDOW_BLACKMAN_HARRIS_4 = 7, /* "blackmanharris": 0.35875, 0.48829, 0.14128, 0.01168 */
  LUMRA_WINDOW_BLACKMAN_HARRIS_7 = 8, /* "blackmanharris7": 0.27105140069342415, 0.43329793923448606, ... */
  LUMRA_WINDOW_LOW_SIDELOBE = 9, /* "low_sidelobe": 0.323215218, 0.471492057, 0.17553428, 0.028497078, 0.001261367 */
  LUMRA_WINDOW_BLACKMAN_NUTTALL = 11, /* "nuttall": 0.3635819, 0.4891775, 0.1365995, 0.0106411 */
  LUMRA_WINDOW_SESSION_FLAT_TOP = 12, /* "flattop": 0.21557895, 0.41663158, 0.277263158, 0.083578947, 0.006947368 */
  LUMRA_WINDOW_KAISER = 13 /* "kaiser": I0(beta sqrt(1 - (2x - 1)^2)) / I0(beta), beta in [0, 700] the parameter */
};

/* Where the window ends. Periodic: x = i / n, for spectra. Symmetric: x = i / (n - 1), for filters. One value alone
 * is 1. */
enum lumra_window_span { LUMRA_PERIODIC = 0, LUMRA_SYMMETRIC = 1 };

/* Writes a window's n values, the first at x = 0.
 *
 * type       one of enum lumra_window_type
 * parameter  beta of Kaiser's window, 0 to 700; ignored by all others
 * span       one of enum lumra_window_span
 * out        room for n values; null for n = 0
 *
 * Returns 0, or in the order of the checks: LUMRA_UNKNOWN_CHOICE type; LUMRA_OUT_OF_RANGE parameter;
 * LUMRA_UNKNOWN_CHOICE span; LUMRA_OUT_OF_RANGE n; LUMRA_NULL_ARGUMENT out. */
LUMRA_EXPORT lumra_status lumra_window_make_f32(int32_t type, double parameter, int32_t span, float *out, uint64_t n);
LUMRA_EXPORT lumra_status lumra_window_make_f64(int32_t type, double parameter, int32_t span, double *out, uint64_t n);

/* What a window does to a spectrum of n points. */
typedef struct lumra_window_quality {
  double coherent_gain;        /* mean of the values: what a tone on a bin is multiplied by */
  double noise_bandwidth_bins; /* n sum of w^2 / (sum of w)^2: the width in bins of white noise that a bin collects */
  double scalloping_loss_db;   /* how much lower a tone halfway between two bins reads, positive */
} lumra_window_quality;

/* Computes the figures from the n values, in time proportional to n.
 *
 * n        1 to 2^32
 * figures  written
 *
 * Returns 0, or in the order of the checks: LUMRA_UNKNOWN_CHOICE type; LUMRA_OUT_OF_RANGE parameter;
 * LUMRA_UNKNOWN_CHOICE span; LUMRA_OUT_OF_RANGE n; LUMRA_NULL_ARGUMENT figures. */
LUMRA_EXPORT lumra_status lumra_window_figures(int32_t type, double parameter, int32_t span, uint64_t n,
                                               lumra_window_quality *figures);

/* Finds a window by the names above; "kaiser:8.6" carries its parameter, "kaiser" alone gives 0.
 *
 * name       text with its NUL
 * type       written
 * parameter  written; may be null
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT name, type; LUMRA_UNKNOWN_CHOICE a name that is none,
 * or a parameter that is no number; LUMRA_OUT_OF_RANGE a parameter out of range. Nothing is written then. */
LUMRA_EXPORT lumra_status lumra_window_by_name(const char *name, int32_t *type, double *parameter);

#ifdef __cplusplus
}
#endif

#endif
