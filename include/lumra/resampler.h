/* Streams at other sample rates. SPDX-License-Identifier: MIT
 *
 * Output sample k lies at the time k / output rate, input sample n at n / input rate, exactly and for ever: the ratio
 * of both rates is a fraction of integers, and no delay is left in. n input samples give ceil(n output rate / input
 * rate) output samples once the stream is flushed. The low pass has linear phase. It keeps frequencies up to `passband`
 * of half the lower rate within 0.01 dB; what lies beyond that half, and every image and alias, is rejected by
 * rejection_db. At equal rates samples pass unchanged.
 *
 * Results have the same bits however the stream is cut into calls, and on any number of threads. A NaN or infinity
 * spoils the outputs of its block.
 *
 * Conventions of the open interface: lumra/lumra.h. */
#ifndef LUMRA_RESAMPLER_H
#define LUMRA_RESAMPLER_H

#include <lumra/export.h>
#include <lumra/status.h>
#include <lumra/types.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct lumra_resampler lumra_resampler;

typedef struct lumra_resampler_options {
  uint32_t size;         /* of this record in bytes */
  int32_t type;          /* of samples: LUMRA_TYPE_F32, _F64, _CF32 or _CF64 (enum lumra_type_code) */
  double input_rate_hz;  /* above 0, taken as exactly the number that it is */
  double output_rate_hz; /* the same; both are less than a factor of 10^9 apart */
  uint64_t up, down;     /* not 0: output rate / input rate is up / down, for ratios of rates that doubles do not hold;
                            output_rate_hz is not read then */
  double passband;       /* the part of half the lower rate that is kept, above 0 to 0.99 */
  double rejection_db;   /* 40 to 150; in single precision to 120, where its rounding begins */
  uint32_t channels;     /* rows of samples, 1 to 1024 */
  uint32_t threads;      /* that share the rows: 1, the caller's alone; 0, as many as pay; to 1024 */
} lumra_resampler_options;

#define LUMRA_RESAMPLER_OPTIONS \
  { sizeof(lumra_resampler_options), LUMRA_TYPE_CF32, 1.0, 1.0, 0, 0, 0.9, 100.0, 1, 1 }

/* Makes a resampler.
 *
 * options    null: LUMRA_RESAMPLER_OPTIONS, whose rates are equal
 * resampler  the object's address is written here
 *
 * Returns 0, or in the order of the checks: LUMRA_BAD_SIZE_FIELD options->size; LUMRA_UNKNOWN_CHOICE type;
 * LUMRA_OUT_OF_RANGE rates or up and down, their ratio, passband, rejection_db, channels, threads; LUMRA_NULL_ARGUMENT
 * resampler; LUMRA_TRANSFORM_FAILED. */
LUMRA_EXPORT lumra_status lumra_resampler_create(const lumra_resampler_options *options, lumra_resampler **resampler);

/* Output samples of each row that the next n input samples give.
 *
 * n      at most 2^60 inputs, and as many outputs, since the stream's beginning
 * count  written; n output rate / input rate on average, in blocks
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT resampler; LUMRA_WRONG_OBJECT; LUMRA_OUT_OF_RANGE n;
 * LUMRA_NULL_ARGUMENT count. Nothing but the number of inputs since the stream's beginning decides on it. */
LUMRA_EXPORT lumra_status lumra_resampler_output_count(const lumra_resampler *resampler, uint64_t n, uint64_t *count);

/* Takes the stream's next n samples of every row. No memory is allocated on one thread.
 *
 * in          rows of n samples, each in_stride samples behind the one before
 * out         rows of `room` samples, each out_stride samples behind the one before, at least `room`; apart from in
 * room        at least what lumra_resampler_output_count says
 * written     samples of each row that were written; may be null
 *
 * Strides count with more than one row only; in_stride may be anything, 0 gives all rows the same input.
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT resampler; LUMRA_WRONG_OBJECT; LUMRA_OUT_OF_RANGE n as
 * above, in_stride; LUMRA_NULL_ARGUMENT in; LUMRA_TOO_LITTLE_ROOM room; LUMRA_OUT_OF_RANGE out_stride;
 * LUMRA_NULL_ARGUMENT out; LUMRA_OVERLAP; LUMRA_TRANSFORM_FAILED, after which part of the outputs may have been written
 * and lumra_resampler_reset must be called. */
LUMRA_EXPORT lumra_status lumra_resampler_process(lumra_resampler *resampler, const void *in, uint64_t in_stride,
                                                  uint64_t n, void *out, uint64_t out_stride, uint64_t room,
                                                  uint64_t *written);

/* Output samples of each row that lumra_resampler_flush writes.
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT resampler; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * count. */
LUMRA_EXPORT lumra_status lumra_resampler_flush_count(const lumra_resampler *resampler, uint64_t *count);

/* Ends the stream, as if silence followed, and begins a new one: at a gap in a recording, flush; then go on with what
 * lies behind it. Arguments and statuses are those of lumra_resampler_process. */
LUMRA_EXPORT lumra_status lumra_resampler_flush(lumra_resampler *resampler, void *out, uint64_t out_stride,
                                                uint64_t room, uint64_t *written);

/* Begins a new stream; what was held back is lost.
 *
 * Returns 0, LUMRA_NULL_ARGUMENT or LUMRA_WRONG_OBJECT. */
LUMRA_EXPORT lumra_status lumra_resampler_reset(lumra_resampler *resampler);

/* How the ratio is computed. */
enum lumra_resampler_kind {
  LUMRA_RESAMPLER_COPY = 0,        /* equal rates */
  LUMRA_RESAMPLER_BLOCKS = 1,      /* through transforms of blocks alone */
  LUMRA_RESAMPLER_INTERPOLATOR = 2 /* blocks, then a short filter between samples */
};

typedef struct lumra_resampler_figures {
  uint32_t size;            /* of this record in bytes; set before the call */
  int32_t kind;             /* one of enum lumra_resampler_kind */
  double input_rate_hz;     /* of the options */
  double output_rate_hz;    /* rounded to a double */
  uint64_t up, down;        /* output rate / input rate in lowest terms; both 0 where they need more than 64 bits */
  double pass_edge_hz;      /* the last frequency that is kept; half the lower rate at equal rates */
  double stop_edge_hz;      /* the first that is rejected: half the lower rate */
  double ripple_db;         /* the gain up to the pass edge differs from 1 by at most so much */
  double rejection_db;      /* of the options */
  uint64_t latency_samples; /* the most input samples that are held back before their outputs come */
  double latency_s;         /* the same in seconds */
  uint32_t blocks;          /* steps through blocks */
  uint32_t longest_block;   /* points of the longest transform; 0 without */
} lumra_resampler_figures;

/* What the options have become.
 *
 * figures  size is set by the caller, the rest written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT resampler; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * figures; LUMRA_BAD_SIZE_FIELD figures->size. */
LUMRA_EXPORT lumra_status lumra_resampler_get_figures(const lumra_resampler *resampler,
                                                      lumra_resampler_figures *figures);

/* The options as they were given.
 *
 * options  size is set by the caller, the rest written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT resampler; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * options; LUMRA_BAD_SIZE_FIELD options->size. */
LUMRA_EXPORT lumra_status lumra_resampler_get_options(const lumra_resampler *resampler,
                                                      lumra_resampler_options *options);

/* The type of the resampler's samples.
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT resampler; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * type. */
LUMRA_EXPORT lumra_status lumra_resampler_get_type(const lumra_resampler *resampler, int32_t *type);

/* Bytes of a saved resampler, which changes with the samples that are held back.
 *
 * size  written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT resampler; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * size. */
LUMRA_EXPORT lumra_status lumra_resampler_state_size(const lumra_resampler *resampler, uint64_t *size);

/* Saves the resampler: its options, the stream's position and the samples that are held back.
 *
 * bytes  lumra_resampler_state_size bytes are written
 * room   of bytes
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT resampler; LUMRA_WRONG_OBJECT; LUMRA_TOO_LITTLE_ROOM;
 * LUMRA_NULL_ARGUMENT bytes. */
LUMRA_EXPORT lumra_status lumra_resampler_save(const lumra_resampler *resampler, void *bytes, uint64_t room);

/* Makes a resampler that goes on where a saved one was.
 *
 * bytes      `size` bytes that lumra_resampler_save wrote
 * resampler  the object's address is written here
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT resampler, bytes; LUMRA_BAD_STATE;
 * LUMRA_TRANSFORM_FAILED. */
LUMRA_EXPORT lumra_status lumra_resampler_load(const void *bytes, uint64_t size, lumra_resampler **resampler);

/* Frees the resampler; null is none. */
LUMRA_EXPORT void lumra_resampler_free(lumra_resampler *resampler);

#ifdef __cplusplus
}
#endif

#endif
