/* Levels of streams in one pass: power, peak, direct part and power statistics. SPDX-License-Identifier: MIT
 *
 *   power = mean of |x|^2    rms = sqrt(power)    peak = largest |x|    crest = peak / rms    dc = mean of x
 *
 * An accumulator is cut, merged and read at any time; its results have the same bits however the stream was cut into
 * calls and into objects that were merged: sums are taken in double precision over blocks of 1024 samples, whose
 * borders stand at multiples of 1024 in the stream, and the blocks' sums are added exactly. Nor do they depend on the
 * number of threads: an object shares calls with 65536 samples or more among as many as its options say; or give each
 * of your own an object and a part of the stream, and merge.
 *
 * Power statistics (CCDF): the share of samples whose power is more than some decibels above the mean. An accumulator
 * counts powers in 512 bins an octave, at most 0.0085 dB wide: its shares lie between the exact ones at thresholds
 * 0.0085 dB above and below. lumra_ccdf, which has all samples at hand, is exact. The counting takes about half of the
 * accumulator's time, which is 2.5 ns a complex sample in single precision on a core of 2 GHz.
 *
 * Conventions of the open interface: lumra/lumra.h. */
#ifndef LUMRA_LEVEL_H
#define LUMRA_LEVEL_H

#include <lumra/export.h>
#include <lumra/status.h>
#include <lumra/types.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* The levels of one stretch of a stream. It takes 4 KiB of memory for every octave of power that occurs, and two
 * blocks of samples, and for every further thread as much again for the octaves; address space for 8 MiB a thread is
 * reserved. */
typedef struct lumra_level lumra_level;

typedef struct lumra_level_options {
  uint32_t size;     /* of this record in bytes */
  int32_t type;      /* of the samples, enum lumra_type_code */
  uint64_t start;    /* position in the stream of the first sample that is added, to 2^62 */
  uint32_t threads;  /* 1: the caller's alone; more: at most so many; 0: as many as pay; to 1024 */
  uint32_t reserved; /* 0 */
} lumra_level_options;

#define LUMRA_LEVEL_OPTIONS \
  { sizeof(lumra_level_options), LUMRA_TYPE_CF32, 0, 1, 0 }

typedef struct lumra_level_result {
  uint32_t size;       /* of this record in bytes: set it before the call */
  uint32_t reserved;   /* 0 */
  uint64_t samples;    /* at least 1 */
  double power;        /* mean of |x|^2 */
  double rms;          /* its square root */
  double peak;         /* largest |x|; NaN where a sample is */
  uint64_t peak_index; /* position in the stream of the first sample that has it */
  double dc_re;        /* mean of the samples */
  double dc_im;        /* 0 for real samples */
  double rms_db;       /* of an amplitude of 1, minus infinity for silence */
  double peak_db;      /* of an amplitude of 1, minus infinity for silence */
  double crest_db;     /* peak over rms; NaN for silence */
} lumra_level_result;

/* Makes an accumulator for a stream that begins, or goes on, at options->start.
 *
 * options  as above; null for LUMRA_LEVEL_OPTIONS
 * level    the object's address is written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT level; LUMRA_BAD_SIZE_FIELD options;
 * LUMRA_UNKNOWN_CHOICE type; LUMRA_OUT_OF_RANGE start, threads, reserved. Any thread. */
LUMRA_EXPORT lumra_status lumra_level_create(const lumra_level_options *options, lumra_level **level);

/* Adds the stream's next samples. Allocates nothing.
 *
 * x  n samples of the object's type
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT level; LUMRA_WRONG_OBJECT; LUMRA_OUT_OF_RANGE n;
 * LUMRA_NULL_ARGUMENT x; LUMRA_OUT_OF_RANGE a stream of more than 2^62 samples. */
LUMRA_EXPORT lumra_status lumra_level_add(lumra_level *level, const void *x, uint64_t n);

/* Joins two neighbours: `level` is then what it would be if it had been given the samples of `next`, too.
 *
 * next  not changed; of the same type; its start is the position behind the last sample of `level`
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT, LUMRA_WRONG_OBJECT level; the same for next;
 * LUMRA_OVERLAP where both are one; LUMRA_WRONG_TYPE; LUMRA_OUT_OF_RANGE start of `next`. One thread at a time for
 * either object. */
LUMRA_EXPORT lumra_status lumra_level_merge(lumra_level *level, const lumra_level *next);

/* Where an accumulator stands. */
typedef struct lumra_level_extent {
  uint64_t start;   /* position of the first sample */
  uint64_t samples; /* added */
  int32_t type;     /* of the samples */
  int32_t reserved; /* 0 */
} lumra_level_extent;

/* Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT level; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * extent. */
LUMRA_EXPORT lumra_status lumra_level_where(const lumra_level *level, lumra_level_extent *extent);

/* Reads the levels of the samples so far; the accumulator goes on unchanged.
 *
 * result  written; its size is set by the caller
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT level; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT result;
 * LUMRA_BAD_SIZE_FIELD result; LUMRA_TOO_FEW_SAMPLES where there is none. */
LUMRA_EXPORT lumra_status lumra_level_read(const lumra_level *level, lumra_level_result *result);

/* Reads the power statistics of the samples so far.
 *
 * above_db  count levels in dB above the mean power, in any order
 * share     count values from 0 to 1 are written: the share of samples whose power is more than that above the mean;
 *           NaN where a sample or the level is
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT level; LUMRA_WRONG_OBJECT; LUMRA_OUT_OF_RANGE count;
 * LUMRA_NULL_ARGUMENT above_db, share; LUMRA_OVERLAP; LUMRA_TOO_FEW_SAMPLES where there is no sample. */
LUMRA_EXPORT lumra_status lumra_level_ccdf(const lumra_level *level, const double *above_db, double *share,
                                           uint64_t count);

/* Bytes of a saved state. Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT level; LUMRA_WRONG_OBJECT;
 * LUMRA_NULL_ARGUMENT size. */
LUMRA_EXPORT lumra_status lumra_level_state_size(const lumra_level *level, uint64_t *size);

/* Saves the accumulator with its options.
 *
 * bytes  lumra_level_state_size bytes are written
 * room   of bytes
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT level; LUMRA_WRONG_OBJECT; LUMRA_TOO_LITTLE_ROOM;
 * LUMRA_NULL_ARGUMENT bytes. */
LUMRA_EXPORT lumra_status lumra_level_save(const lumra_level *level, void *bytes, uint64_t room);

/* Makes the accumulator that was saved, for the caller's thread alone.
 *
 * bytes  `size` bytes that lumra_level_save wrote
 * level  the object's address is written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT level, bytes; LUMRA_BAD_STATE. */
LUMRA_EXPORT lumra_status lumra_level_load(const void *bytes, uint64_t size, lumra_level **level);

/* Frees the object; null is none. */
LUMRA_EXPORT void lumra_level_free(lumra_level *level);

/* Power statistics of a record, exactly: two passes over it.
 *
 * x         n samples, at least 1
 * above_db  count levels in dB above the mean power, in any order
 * share     count values are written, as by lumra_level_ccdf
 *
 * Return 0, or in the order of the checks: LUMRA_OUT_OF_RANGE n; LUMRA_NULL_ARGUMENT x; LUMRA_TOO_FEW_SAMPLES where n
 * is 0; LUMRA_OUT_OF_RANGE count; LUMRA_NULL_ARGUMENT above_db, share; LUMRA_OVERLAP. */
LUMRA_EXPORT lumra_status lumra_ccdf_f32(const float *x, uint64_t n, const double *above_db, double *share,
                                         uint64_t count);
LUMRA_EXPORT lumra_status lumra_ccdf_f64(const double *x, uint64_t n, const double *above_db, double *share,
                                         uint64_t count);
LUMRA_EXPORT lumra_status lumra_ccdf_cf32(const lumra_cf32 *x, uint64_t n, const double *above_db, double *share,
                                          uint64_t count);
LUMRA_EXPORT lumra_status lumra_ccdf_cf64(const lumra_cf64 *x, uint64_t n, const double *above_db, double *share,
                                          uint64_t count);

#ifdef __cplusplus
}
#endif

#endif
