/* Channels out of one wideband stream. SPDX-License-Identifier: MIT
 *
 * A channel is the stream times exp(-2 pi j centre t), filtered and at a rate of its own: its sample k lies at the time
 * k / rate, exactly and for ever, where t = 0 is the stream's first sample. No delay is left in. The phase of the
 * shift is computed in units of 2^-128 cycles: after 10^12 samples it is exact to 10^-26 cycles, whatever the centre
 * is. n samples of the stream give ceil(n rate / sample rate) samples of the channel once the stream is flushed.
 *
 * The filter has linear phase. It keeps frequencies up to `passband` of half the channel's rate from its centre within
 * 0.01 dB, and rejects by rejection_db what lies beyond half the rate, its aliases and the images of all other
 * channels. A channel at the stream's rate and centre is a copy of the stream.
 *
 * All channels share the transforms of the stream's blocks, so that many of them cost little more than one. Results
 * have the same bits however the stream is cut into calls, and on any number of threads. A NaN or infinity spoils the
 * outputs of its blocks in all channels.
 *
 * Conventions of the open interface: lumra/lumra.h. */
#ifndef LUMRA_CHANNELIZER_H
#define LUMRA_CHANNELIZER_H

#include <lumra/export.h>
#include <lumra/status.h>
#include <lumra/types.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct lumra_channelizer lumra_channelizer;

/* A channel that is wanted. Its pass band lies within half the sample rate to either side of 0. */
typedef struct lumra_channelizer_channel {
  double centre_hz; /* from the stream's centre, at most half the sample rate to either side */
  double rate_hz;   /* above 10^-9 of the sample rate, up to the sample rate; taken as exactly the number that it is */
  double passband;  /* the part of half the rate that is kept, above 0 to 0.99; 0: 0.9 */
} lumra_channelizer_channel;

typedef struct lumra_channelizer_options {
  uint32_t size;         /* of this record in bytes */
  int32_t type;          /* of the stream's samples: LUMRA_TYPE_F32, _F64, _CF32 or _CF64 (enum lumra_type_code);
                            channels are complex, of the same precision */
  double sample_rate_hz; /* of the stream, above 0 */
  double rejection_db;   /* 40 to 150; in single precision to 120, where its rounding begins */
  uint32_t threads;      /* that share the channels: 1, the caller's alone; 0, as many as pay; to 1024 */
  uint32_t reserved;     /* 0 */
} lumra_channelizer_options;

#define LUMRA_CHANNELIZER_OPTIONS \
  { sizeof(lumra_channelizer_options), LUMRA_TYPE_CF32, 1.0, 80.0, 1, 0 }

/* Makes a channelizer.
 *
 * options      null: LUMRA_CHANNELIZER_OPTIONS, with a sample rate of 1 Hz
 * channels     `count` records, which are copied
 * count        1 to 4096
 * channelizer  the object's address is written here
 *
 * Returns 0, or in the order of the checks: LUMRA_BAD_SIZE_FIELD options->size; LUMRA_UNKNOWN_CHOICE type;
 * LUMRA_OUT_OF_RANGE sample_rate_hz, rejection_db, threads, reserved, count; LUMRA_NULL_ARGUMENT channels;
 * LUMRA_OUT_OF_RANGE of each channel rate_hz, passband, centre_hz and a pass band beyond the stream's band;
 * LUMRA_NULL_ARGUMENT channelizer; LUMRA_TRANSFORM_FAILED. */
LUMRA_EXPORT lumra_status lumra_channelizer_create(const lumra_channelizer_options *options,
                                                   const lumra_channelizer_channel *channels, uint64_t count,
                                                   lumra_channelizer **channelizer);

/* Samples of each channel that the stream's next n samples give.
 *
 * n       at most 2^60 samples since the stream's beginning
 * counts  as many as there are channels are written; n rate / sample rate on average, in blocks
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT channelizer; LUMRA_WRONG_OBJECT; LUMRA_OUT_OF_RANGE n;
 * LUMRA_NULL_ARGUMENT counts. Nothing but the number of samples since the stream's beginning decides on it. */
LUMRA_EXPORT lumra_status lumra_channelizer_output_counts(const lumra_channelizer *channelizer, uint64_t n,
                                                          uint64_t *counts);

/* Takes the stream's next n samples. No memory is allocated on one thread.
 *
 * in       n samples
 * out      for each channel the address of its samples, lumra_cf32 or lumra_cf64; null where none come
 * room     for each channel, in samples: at least what lumra_channelizer_output_counts says
 * written  for each channel the samples that were written; may be null
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT channelizer; LUMRA_WRONG_OBJECT; LUMRA_OUT_OF_RANGE n;
 * LUMRA_NULL_ARGUMENT in, out, room; of each channel LUMRA_TOO_LITTLE_ROOM and LUMRA_NULL_ARGUMENT its address;
 * LUMRA_OVERLAP of an output with the input or another output; LUMRA_TRANSFORM_FAILED, after which part of the outputs
 * may have been written and lumra_channelizer_reset must be called. */
LUMRA_EXPORT lumra_status lumra_channelizer_process(lumra_channelizer *channelizer, const void *in, uint64_t n,
                                                    void *const *out, const uint64_t *room, uint64_t *written);

/* Samples of each channel that lumra_channelizer_flush writes.
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT channelizer; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * counts. */
LUMRA_EXPORT lumra_status lumra_channelizer_flush_counts(const lumra_channelizer *channelizer, uint64_t *counts);

/* Ends the stream, as if silence followed, and begins a new one: before a gap in a recording, flush; then go on with
 * what lies behind it. Arguments and statuses are those of lumra_channelizer_process. */
LUMRA_EXPORT lumra_status lumra_channelizer_flush(lumra_channelizer *channelizer, void *const *out,
                                                  const uint64_t *room, uint64_t *written);

/* Begins a new stream; what was held back is lost.
 *
 * Returns 0, LUMRA_NULL_ARGUMENT or LUMRA_WRONG_OBJECT. */
LUMRA_EXPORT lumra_status lumra_channelizer_reset(lumra_channelizer *channelizer);

typedef struct lumra_channelizer_figures {
  uint32_t size;       /* of this record in bytes; set before the call */
  uint32_t reserved;   /* 0 */
  double centre_hz;    /* as it was given */
  double rate_hz;      /* as it was given */
  double pass_edge_hz; /* from the centre: the last frequency that is kept; of a copy half the rate */
  double stop_edge_hz; /* from the centre: the first frequency that is rejected, half the rate */
  double ripple_db;    /* the gain up to the pass edge differs from 1 by at most so much; 0 of a copy */
  double rejection_db; /* of the options */
  uint64_t
      latency_samples; /* the most samples of the stream that may come before one's place in the channel is there */
  double latency_s;    /* the same in seconds */
} lumra_channelizer_figures;

/* What a channel is like.
 *
 * index    of the channel, from 0
 * figures  size is set by the caller, the rest written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT channelizer; LUMRA_WRONG_OBJECT; LUMRA_OUT_OF_RANGE
 * index; LUMRA_NULL_ARGUMENT figures; LUMRA_BAD_SIZE_FIELD figures->size. */
LUMRA_EXPORT lumra_status lumra_channelizer_get_figures(const lumra_channelizer *channelizer, uint64_t index,
                                                        lumra_channelizer_figures *figures);

/* The number of channels.
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT channelizer; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * count. */
LUMRA_EXPORT lumra_status lumra_channelizer_get_count(const lumra_channelizer *channelizer, uint64_t *count);

/* The type of the stream's samples.
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT channelizer; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * type. */
LUMRA_EXPORT lumra_status lumra_channelizer_get_type(const lumra_channelizer *channelizer, int32_t *type);

/* Bytes of a saved channelizer, which changes with the samples that are held back.
 *
 * size  written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT channelizer; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * size. */
LUMRA_EXPORT lumra_status lumra_channelizer_state_size(const lumra_channelizer *channelizer, uint64_t *size);

/* Saves the channelizer: its options and channels, the stream's position and the samples that are held back.
 *
 * bytes  lumra_channelizer_state_size bytes are written
 * room   of bytes
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT channelizer; LUMRA_WRONG_OBJECT; LUMRA_TOO_LITTLE_ROOM;
 * LUMRA_NULL_ARGUMENT bytes. */
LUMRA_EXPORT lumra_status lumra_channelizer_save(const lumra_channelizer *channelizer, void *bytes, uint64_t room);

/* Makes a channelizer that goes on where a saved one was.
 *
 * bytes        `size` bytes that lumra_channelizer_save wrote
 * channelizer  the object's address is written here
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT channelizer, bytes; LUMRA_BAD_STATE;
 * LUMRA_TRANSFORM_FAILED. */
LUMRA_EXPORT lumra_status lumra_channelizer_load(const void *bytes, uint64_t size, lumra_channelizer **channelizer);

/* Frees the channelizer; null is none. */
LUMRA_EXPORT void lumra_channelizer_free(lumra_channelizer *channelizer);

#ifdef __cplusplus
}
#endif

#endif
