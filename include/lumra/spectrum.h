/* Averaged power spectra of streams, as accumulators that are cut, merged and read at any time.
 * SPDX-License-Identifier: MIT
 *
 *   P[k] = mean over the segments s of |sum over i of w[i] x[s + i] exp(-2 pi j i k / N)|^2 / (sum over i of w[i])^2
 *
 * N points, window w. Segments begin `step` = N - floor(overlap N) samples after one another, the first at the origin.
 * A complex tone of amplitude 1 on a bin reads 1. Complex samples give N bins in ascending frequency, bin k at
 * centre + (k - floor(N / 2)) rate / N. Real samples give the N / 2 + 1 bins (rounded down) from 0 to half the rate,
 * with the power of the negative frequencies in those that have any. Source: P. D. Welch, IEEE Trans. AU-15 (1967),
 * 70-73; equal to scipy.signal.welch(..., detrend=False, scaling="spectrum").
 *
 * The result has the same bits however the stream is cut into calls and into objects that are merged, and with any
 * number of threads: the powers of up to eight neighbours are added one after the other, and these sums in pairs along
 * a binary tree, both by the positions at which the segments begin; which also keeps the rounding small. Conventions of
 * the open interface: lumra/lumra.h. */
#ifndef LUMRA_SPECTRUM_H
#define LUMRA_SPECTRUM_H

#include <lumra/export.h>
#include <lumra/status.h>
#include <lumra/types.h>
#include <lumra/window.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* The averaged spectrum of one stretch of a stream. */
typedef struct lumra_spectrum_average lumra_spectrum_average;

/* What is kept beside the mean, for each bin. */
enum lumra_hold { LUMRA_HOLD_NONE = 0, LUMRA_HOLD_EXTREMES = 1 /* the largest and the smallest segment's power */ };

typedef struct lumra_spectrum_options {
  uint32_t size;           /* of this record in bytes */
  int32_t type;            /* of the samples, enum lumra_type_code */
  double sample_rate_hz;   /* above 0 */
  double centre_hz;        /* added to all frequencies */
  uint64_t points;         /* N, 16 to 2^27 */
  int32_t window;          /* enum lumra_window_type; periodic */
  int32_t hold;            /* enum lumra_hold */
  double window_parameter; /* of Kaiser's window */
  double overlap;          /* fraction of a segment that the next one shares, 0 or more, below 1 */
  uint32_t threads;        /* 1: the caller's alone; more: at most so many; 0: as many as pay */
  uint32_t reserved;       /* 0 */
  uint64_t start;          /* position in the stream of the first sample that is added, to 2^62 */
  uint64_t origin;         /* position from which segments count, 0 or that of the last gap, at most start */
} lumra_spectrum_options;

#define LUMRA_SPECTRUM_OPTIONS                                                                                       \
  {                                                                                                                  \
    sizeof(lumra_spectrum_options), LUMRA_TYPE_CF32, 1.0, 0.0, 4096, LUMRA_WINDOW_SESSION_FLAT_TOP, LUMRA_HOLD_NONE, \
        0.0, 0.5, 0, 0, 0, 0                                                                                         \
  }

/* What the bins of a power spectrum stand for. lumra_spectrum_read writes it, the functions of measure.h read it; for a
 * spectrum from elsewhere, fill it in. */
typedef struct lumra_spectrum_info {
  uint32_t size;                  /* of this record in bytes: set it before either use */
  int32_t sides;                  /* 2: all bins of complex samples; 1: those of real samples from 0 to half the rate */
  uint64_t points;                /* N */
  uint64_t segments;              /* averaged */
  double sample_rate_hz;          /* above 0 */
  double centre_hz;               /* of the band; with one side, what is added to the frequencies from 0 on */
  double first_hz;                /* the frequency of bin 0 */
  double spacing_hz;              /* from a bin to the next, sample_rate_hz / points */
  double noise_bandwidth_bins;    /* of the window */
  double resolution_bandwidth_hz; /* noise_bandwidth_bins spacing_hz: what divides a power into a density per hertz */
  int32_t window;                 /* enum lumra_window_type */
  int32_t reserved;               /* 0 */
  double window_parameter;
} lumra_spectrum_info;

/* Makes an accumulator for a stream that begins, or goes on, at options->start.
 *
 * options   as above; null for LUMRA_SPECTRUM_OPTIONS
 * spectrum  the object's address is written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT spectrum; LUMRA_BAD_SIZE_FIELD options;
 * LUMRA_UNKNOWN_CHOICE type; LUMRA_OUT_OF_RANGE sample_rate_hz, centre_hz, points; LUMRA_UNKNOWN_CHOICE window, hold;
 * LUMRA_OUT_OF_RANGE window_parameter, overlap, threads (to 1024), reserved, start, origin; LUMRA_TRANSFORM_FAILED. Any
 * thread. */
LUMRA_EXPORT lumra_status lumra_spectrum_create(const lumra_spectrum_options *options,
                                                lumra_spectrum_average **spectrum);

/* Adds the stream's next samples. Those of an unfinished segment are kept.
 *
 * x  n samples of the object's type
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT spectrum; LUMRA_WRONG_OBJECT; LUMRA_OUT_OF_RANGE n, or
 * a stream of more than 2^62 samples; LUMRA_NULL_ARGUMENT x; LUMRA_TRANSFORM_FAILED, after which every function but
 * lumra_spectrum_free refuses the object with that code. */
LUMRA_EXPORT lumra_status lumra_spectrum_add(lumra_spectrum_average *spectrum, const void *x, uint64_t n);

/* Ends the stream's present run: the samples of its unfinished segment are dropped, and the next sample begins new
 * segments. It takes no position of its own.
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT; LUMRA_WRONG_OBJECT; LUMRA_TRANSFORM_FAILED as after a
 * failed lumra_spectrum_add. */
LUMRA_EXPORT lumra_status lumra_spectrum_gap(lumra_spectrum_average *spectrum);

/* Joins two neighbours: `spectrum` is then what it would be if it had been given the samples of `next`, too. Segments
 * across the border are completed.
 *
 * next  not changed; its start is the position behind the last sample of `spectrum`, and its origin that of
 *       `spectrum`, or its own start where a gap is between the two. All other options but threads are the same
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT spectrum, next; LUMRA_WRONG_OBJECT spectrum, next;
 * LUMRA_OVERLAP where both are one; LUMRA_WRONG_TYPE other options; LUMRA_OUT_OF_RANGE start or origin of `next`;
 * LUMRA_TRANSFORM_FAILED as lumra_spectrum_add. One thread at a time for either object. */
LUMRA_EXPORT lumra_status lumra_spectrum_merge(lumra_spectrum_average *spectrum, const lumra_spectrum_average *next);

/* Where an accumulator stands. */
typedef struct lumra_spectrum_extent {
  uint64_t start;    /* position of the first sample */
  uint64_t samples;  /* added */
  uint64_t segments; /* complete */
  uint64_t origin;   /* from which segments count now */
  uint64_t bins;     /* that lumra_spectrum_read writes: N, or N / 2 + 1 for real samples */
} lumra_spectrum_extent;

/* Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT spectrum; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * extent. */
LUMRA_EXPORT lumra_status lumra_spectrum_where(const lumra_spectrum_average *spectrum, lumra_spectrum_extent *extent);

/* The options that the object has: those it was made or saved with, start and origin of its present first sample, and
 * threads as they are.
 *
 * options  written; its size is set by the caller
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT spectrum; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * options; LUMRA_BAD_SIZE_FIELD options. */
LUMRA_EXPORT lumra_status lumra_spectrum_get_options(const lumra_spectrum_average *spectrum,
                                                     lumra_spectrum_options *options);

/* Reads the spectrum of the segments that are complete; the accumulator goes on unchanged.
 *
 * info     written; its size is set by the caller
 * power    room for `room` bins; the mean
 * maximum  the same, the largest power of any segment; null, or the object holds extremes
 * minimum  the same, the smallest
 * room     of each array in bins
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT spectrum; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT info;
 * LUMRA_BAD_SIZE_FIELD info; LUMRA_TOO_LITTLE_ROOM; LUMRA_NULL_ARGUMENT power; LUMRA_WRONG_TYPE maximum or minimum of an
 * object that holds none; LUMRA_OVERLAP two of the arrays; LUMRA_TOO_FEW_SAMPLES where no segment is complete;
 * LUMRA_TRANSFORM_FAILED as after a failed lumra_spectrum_add. */
LUMRA_EXPORT lumra_status lumra_spectrum_read(const lumra_spectrum_average *spectrum, lumra_spectrum_info *info,
                                              double *power, double *maximum, double *minimum, uint64_t room);

/* Forgets the average and goes on with the stream, as if the object had been made with the position of the next
 * segment's first sample as its start and given the samples from there on.
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT; LUMRA_WRONG_OBJECT; LUMRA_TRANSFORM_FAILED as after a
 * failed lumra_spectrum_add. */
LUMRA_EXPORT lumra_status lumra_spectrum_clear(lumra_spectrum_average *spectrum);

/* Bytes of a saved state. Sums of up to twice the binary logarithm of the number of segments are in it, and samples of
 * up to two segments.
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT spectrum; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT size;
 * LUMRA_TRANSFORM_FAILED as after a failed lumra_spectrum_add. */
LUMRA_EXPORT lumra_status lumra_spectrum_state_size(const lumra_spectrum_average *spectrum, uint64_t *size);

/* Saves the accumulator with its options, but for threads.
 *
 * bytes  lumra_spectrum_state_size bytes are written
 * room   of bytes
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT spectrum; LUMRA_WRONG_OBJECT; LUMRA_TRANSFORM_FAILED;
 * LUMRA_TOO_LITTLE_ROOM; LUMRA_NULL_ARGUMENT bytes. */
LUMRA_EXPORT lumra_status lumra_spectrum_save(const lumra_spectrum_average *spectrum, void *bytes, uint64_t room);

/* Makes the accumulator that was saved.
 *
 * bytes     `size` bytes that lumra_spectrum_save wrote
 * threads   as in the options
 * spectrum  the object's address is written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT spectrum; LUMRA_OUT_OF_RANGE threads;
 * LUMRA_NULL_ARGUMENT bytes; LUMRA_BAD_STATE; LUMRA_TRANSFORM_FAILED. */
LUMRA_EXPORT lumra_status lumra_spectrum_load(const void *bytes, uint64_t size, uint32_t threads,
                                              lumra_spectrum_average **spectrum);

/* Frees the object; null is none. */
LUMRA_EXPORT void lumra_spectrum_free(lumra_spectrum_average *spectrum);

#ifdef __cplusplus
}
#endif

#endif
