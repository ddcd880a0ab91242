/* Fourier transforms of one dimension, for many rows at once. SPDX-License-Identifier: MIT
 *
 *   forward    X[k] = s sum over i of x[i] exp(-2 pi j i k / N)
 *   backward   x[i] = t sum over k of X[k] exp(+2 pi j i k / N)      N points, factors s and t by the scaling
 *
 * A record is the N samples x, a spectrum its bins. A complex record has N bins, k in 0 to N - 1; a real one N / 2 + 1
 * (rounded down), k in 0 to N / 2: the others are their conjugates. Bin 0, and bin N / 2 of an even N, are real there:
 * forward writes 0 into their imaginary parts, backward does not look at them.
 *
 * The error, relative to the largest bin, is a small multiple of the precision's epsilon times log2(N). Conventions of
 * the open interface: lumra/lumra.h. */
#ifndef LUMRA_TRANSFORM_H
#define LUMRA_TRANSFORM_H

#include <lumra/export.h>
#include <lumra/status.h>
#include <lumra/types.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Transforms of one size and type. */
typedef struct lumra_fft lumra_fft;

/* The factors s of forward and t of backward. There and back gives the record again, but for LUMRA_FFT_UNSCALED, which
 * gives N times the record. */
enum lumra_fft_scaling {
  LUMRA_FFT_SCALE_BACKWARD = 0, /* 1, 1 / N */
  LUMRA_FFT_SCALE_FORWARD = 1,  /* 1 / N, 1 */
  LUMRA_FFT_SCALE_BOTH = 2,     /* 1 / sqrt(N), 1 / sqrt(N) */
  LUMRA_FFT_UNSCALED = 3        /* 1, 1 */
};

typedef struct lumra_fft_options {
  uint32_t size;    /* of this record in bytes */
  int32_t type;     /* of the samples, enum lumra_type_code; bins are complex, of the same precision */
  uint64_t points;  /* N, 1 to 2^27; any number, products of small primes are fastest */
  int32_t scaling;  /* enum lumra_fft_scaling */
  int32_t reserved; /* 0 */
} lumra_fft_options;

#define LUMRA_FFT_OPTIONS \
  { sizeof(lumra_fft_options), LUMRA_TYPE_CF32, 1024, LUMRA_FFT_SCALE_BACKWARD, 0 }

/* Makes the transforms, and room for what strides and transforms in place need: at most 32 MiB, or two records where
 * those are larger. That room is taken from the system when it is used first.
 *
 * options  as above; null for LUMRA_FFT_OPTIONS
 * fft      the object's address is written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT fft; LUMRA_BAD_SIZE_FIELD options;
 * LUMRA_UNKNOWN_CHOICE type; LUMRA_OUT_OF_RANGE points; LUMRA_UNKNOWN_CHOICE scaling; LUMRA_OUT_OF_RANGE reserved;
 * LUMRA_TRANSFORM_FAILED. Any thread. */
LUMRA_EXPORT lumra_status lumra_fft_create(const lumra_fft_options *options, lumra_fft **fft);

/* Where the rows lie: distances in elements, samples for records and bins for spectra. They may be negative; the
 * addresses of the call are those of element 0 of row 0. Element i of row r lies at r * distance + i * step. An axis of
 * an array with more dimensions is transformed with its stride as the step and the stride of another axis as the
 * distance. */
typedef struct lumra_fft_layout {
  int64_t record_step;       /* from a sample to the next */
  int64_t record_distance;   /* from a record to the next */
  int64_t spectrum_step;     /* from a bin to the next */
  int64_t spectrum_distance; /* from a spectrum to the next */
} lumra_fft_layout;

/* Transforms `rows` records into spectra, or spectra into records.
 *
 * record    samples of the object's type: rows * N of them without a layout
 * spectrum  complex bins of the same precision: rows * N of them without a layout, rows * (N / 2 + 1) of real records
 * rows      0 does nothing, and both addresses may be null
 * layout    null for rows one after the other with nothing between: steps of 1, distances of the numbers above
 *
 * What is read and what is written are different memory, or in place: the same address and
 * - for complex records the same step and distance for both;
 * - for real records steps of 1, and with more than one row record_distance = 2 * spectrum_distance, so that each row
 *   has room for its bins. A single row of an array of 2 * (N / 2 + 1) reals needs no layout.
 * Elements that are read may lie in several rows (a distance of 0, for one). Of what is written, rows lie behind one
 * another or interleave: distance beyond a row's last element, or step beyond the last row.
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT, LUMRA_WRONG_OBJECT fft; LUMRA_OUT_OF_RANGE rows or
 * layout that reach further than 2^62 bytes; LUMRA_NULL_ARGUMENT record, spectrum; LUMRA_OVERLAP rows that are written
 * overlap each other, or what is read; LUMRA_TRANSFORM_FAILED, and then outputs may hold anything. One thread at a time
 * for an object. */
LUMRA_EXPORT lumra_status lumra_fft_forward(lumra_fft *fft, const void *record, void *spectrum, uint64_t rows,
                                            const lumra_fft_layout *layout);
LUMRA_EXPORT lumra_status lumra_fft_backward(lumra_fft *fft, const void *spectrum, void *record, uint64_t rows,
                                             const lumra_fft_layout *layout);

/* Frees the object. Null, and what was freed already, do nothing. */
LUMRA_EXPORT void lumra_fft_free(lumra_fft *fft);

#ifdef __cplusplus
}
#endif

#endif
