/* Error vectors of two streams: how a measured one differs from its reference. SPDX-License-Identifier: MIT
 *
 *   measured[n] = gain reference[n - delay] exp(2 pi j frequency n / sample_rate) + dc + noise
 *   error[n] = ((measured[n] - dc) exp(-2 pi j frequency n / sample_rate) / gain - reference[n - delay]) / rms
 *
 * where rms is that of reference[n - delay] over the samples that are compared. What of gain, delay, frequency and dc
 * is asked for is found by least squares; the rest is 1, 0, 0 and 0. With nothing asked for, these are the plain
 * formulas.
 *
 * Delays are found between -500 and 500 samples, and at most half the record; a positive one means that the measured
 * stream is late. Frequencies are found in the whole band, from minus to plus half the rate. First comes a search over
 * all delays, all frequencies, or both at once, on the part of the record with the most energy: 131072 samples, and
 * 8192 for both at once, which must hold enough of the signal to tell one delay from another: some tens of symbols.
 * Then the model's parameters are refined together on longer and longer parts, up to the whole record.
 *
 * What limits the parameters is noise. At a signal-to-noise ratio S (as a power), with n samples of a signal that fills
 * a fraction B of the band, their standard deviations are about 0.55 / (B sqrt(n S)) samples, 0.4 sample_rate / (n
 * sqrt(n S)) hertz, and 1 / sqrt(n S) of the gain. Besides, the reference is interpolated between its samples by
 * Fourier transforms, and what lay in front of it and behind it is not known. Where the outer tenth of the band is free
 * this leaves errors of about 2e-5 (1000 samples; less with more of them); a signal that fills its band to the edges is
 * taken as periodic, and if it is not, errors of about 1 / sqrt(n), with at most 262144 samples as n, are left. With a
 * delay, 32 samples at both ends of the reference (an eighth of records shorter than 256) are left out, and those
 * without a partner. Phases are MKL's, below one unit in the last place.
 *
 * Streams of any length, or in chunks, are compared in constant memory by a meter under a model that is known so far:
 *
 *   1. lumra_evm_measure_* on one part of the streams, 262144 samples where there is signal, gives delay and
 *      frequency.
 *   2. A meter under that model takes this part; lumra_evm_meter_refine gives a better model and how long a part, with
 *      this one in its middle, may be given next to a new meter under that model, up to the whole streams: until it
 *      says that the model is settled.
 *   3. A meter under the settled model with nothing to align reads the figures.
 *
 * lumra_evm_measure_* does just this with longer records, so that the results have the same bits.
 *
 * Conventions of the open interface: lumra/lumra.h. */
#ifndef LUMRA_EVM_H
#define LUMRA_EVM_H

#include <lumra/export.h>
#include <lumra/status.h>
#include <lumra/types.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* What is aligned; they add up. */
enum lumra_align {
  LUMRA_ALIGN_NONE = 0,
  LUMRA_ALIGN_GAIN = 1,      /* complex */
  LUMRA_ALIGN_DELAY = 2,     /* fractions of a sample, too */
  LUMRA_ALIGN_FREQUENCY = 4, /* offset of the carriers */
  LUMRA_ALIGN_DC = 8         /* complex */
};

typedef struct lumra_evm_options {
  uint32_t size;         /* of this record in bytes */
  uint32_t align;        /* sum of enum lumra_align */
  double sample_rate_hz; /* above 0; in which the frequency is told */
  uint32_t threads;      /* 1: the caller's alone; more: at most so many; 0: as many as pay; to 1024 */
  uint32_t reserved;     /* 0 */
} lumra_evm_options;

#define LUMRA_EVM_OPTIONS \
  { sizeof(lumra_evm_options), LUMRA_ALIGN_NONE, 1.0, 1, 0 }

typedef struct lumra_evm_result {
  uint32_t size;        /* of this record in bytes: set it before the call */
  uint32_t reserved;    /* 0 */
  uint64_t first;       /* index of the first measured sample that was compared */
  uint64_t samples;     /* that were compared, from it on */
  double rms;           /* of the error vectors, as a fraction of the reference's RMS, as the next two are */
  double peak;          /* largest length of an error vector; NaN where one is */
  double magnitude_rms; /* of the differences of magnitudes */
  double phase_rms;     /* of the differences of phases in radians; samples of 0 have none */
  uint64_t peak_index;  /* of the first measured sample that has the peak */
  double reference_rms; /* of the samples that were compared */
  double gain_re;       /* of the model; 1 where not asked for */
  double gain_im;       /* of the model; 0 where not asked for */
  double delay_samples; /* of the model; 0 where not asked for */
  double frequency_hz;  /* of the model, to half the rate; 0 where not asked for */
  double dc_re;         /* of the model, in the measured stream; 0 where not asked for */
  double dc_im;         /* of the model, in the measured stream; 0 where not asked for */
} lumra_evm_result;

/* Compares n measured samples with their reference.
 *
 * reference  n samples; not all zero
 * measured   n samples
 * options    as above; null for LUMRA_EVM_OPTIONS
 * result     written; its size is set by the caller
 * error      receives n error vectors as fractions of the reference's RMS, or null
 * magnitude  receives n differences of magnitudes, |.| of measured less that of reference, as such fractions, or null
 * phase      receives n differences of phases in radians from -pi to pi, or null. All three are NaN for samples that
 *            are not compared, and lie apart from each other and from the inputs
 *
 * n is at least 1, and at least 64 where delay or frequency is asked for. NaN and infinity spoil the results, or are
 * refused as unrelated. The results have the same bits for any number of threads, which share what is compared once the
 * search is over: records of more than 16384 samples without delay and frequency, of more than 262144 with them, where
 * each thread takes 20 MB.
 *
 * Return 0, or in the order of the checks: LUMRA_BAD_SIZE_FIELD options; LUMRA_UNKNOWN_CHOICE align; LUMRA_OUT_OF_RANGE
 * sample_rate_hz, threads, reserved, n; LUMRA_NULL_ARGUMENT reference, measured; LUMRA_NULL_ARGUMENT,
 * LUMRA_BAD_SIZE_FIELD result; LUMRA_OVERLAP; LUMRA_TOO_FEW_SAMPLES; LUMRA_OUT_OF_RANGE a reference of zeros;
 * LUMRA_NO_CONVERGENCE where gain, delay or frequency is asked for and the recordings seem unrelated (the best
 * alignment leaves errors of ten times the reference, or no less than unrelated noise of this length would), or where
 * what is asked for cannot be told from each other (delay and phase of a reference that is a tone);
 * LUMRA_TRANSFORM_FAILED. Any thread. */
LUMRA_EXPORT lumra_status lumra_evm_measure_cf32(const lumra_cf32 *reference, const lumra_cf32 *measured, uint64_t n,
                                                 const lumra_evm_options *options, lumra_evm_result *result,
                                                 lumra_cf32 *error, float *magnitude, float *phase);
LUMRA_EXPORT lumra_status lumra_evm_measure_cf64(const lumra_cf64 *reference, const lumra_cf64 *measured, uint64_t n,
                                                 const lumra_evm_options *options, lumra_evm_result *result,
                                                 lumra_cf64 *error, double *magnitude, double *phase);

/* Compares two streams sample by sample under a model, and sums what a better model follows from. Its results have the
 * same bits however the streams were cut into calls and into meters that were merged: the streams are compared in
 * blocks of LUMRA_EVM_BLOCK samples, whose borders stand at multiples of this in the stream, each with its neighbours
 * in a window of LUMRA_EVM_WINDOW samples, and the blocks' sums are added exactly. Samples of up to two windows are
 * kept, and room for the Fourier transforms of one, 20 MB, where there is a delay. */
typedef struct lumra_evm_meter lumra_evm_meter;

#define LUMRA_EVM_BLOCK 245760
#define LUMRA_EVM_WINDOW 262144

typedef struct lumra_evm_meter_options {
  uint32_t size;         /* of this record in bytes */
  int32_t type;          /* of the samples, LUMRA_TYPE_CF32 or LUMRA_TYPE_CF64 */
  uint32_t align;        /* sum of enum lumra_align: what of the model lumra_evm_meter_refine is to change */
  uint32_t reserved;     /* 0 */
  uint64_t start;        /* position in the streams of the first samples that are added, to 2^62 */
  double sample_rate_hz; /* above 0; in which the frequency is told */
  double gain_re;        /* of the model, not 0 together with gain_im */
  double gain_im;        /* of the model, at the position 0 */
  double delay_samples;  /* of the model, from -501 to 501 */
  double frequency_hz;   /* of the model, finite */
  double dc_re;          /* of the model */
  double dc_im;          /* of the model */
} lumra_evm_meter_options;

#define LUMRA_EVM_METER_OPTIONS \
  { sizeof(lumra_evm_meter_options), LUMRA_TYPE_CF32, LUMRA_ALIGN_NONE, 0, 0, 1.0, 1.0, 0.0, 0.0, 0.0, 0.0, 0.0 }

/* A better model. */
typedef struct lumra_evm_refinement {
  uint32_t size;        /* of this record in bytes: set it before the call */
  uint32_t settled;     /* 1 where the change was small: what another round would change is below 1e-8 samples and turns
                           of the carrier over the record; else 0 */
  uint64_t reach;       /* how many samples, these in their middle, the next meter may have; 2^62 is any number */
  double gain_re;       /* of the better model, at the position 0; as it was where not aligned, as the others are */
  double gain_im;       /* of the better model */
  double delay_samples; /* of the better model */
  double frequency_hz;  /* of the better model, to half the rate */
  double dc_re;         /* of the better model */
  double dc_im;         /* of the better model */
  double reference_rms; /* of the samples that were compared */
} lumra_evm_refinement;

/* Makes a meter for streams that begin, or go on, at options->start.
 *
 * options  as above; null for LUMRA_EVM_METER_OPTIONS
 * meter    the object's address is written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT meter; LUMRA_BAD_SIZE_FIELD options;
 * LUMRA_UNKNOWN_CHOICE type, align; LUMRA_OUT_OF_RANGE reserved, start, sample_rate_hz, gain, delay_samples,
 * frequency_hz, dc. Any thread. */
LUMRA_EXPORT lumra_status lumra_evm_meter_create(const lumra_evm_meter_options *options, lumra_evm_meter **meter);

/* Adds the streams' next samples. Where memory runs out or a transform fails, some of them may have been added:
 * lumra_evm_meter_where tells how many.
 *
 * reference  n samples of the object's type
 * measured   n samples of the object's type
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT meter; LUMRA_WRONG_OBJECT; LUMRA_OUT_OF_RANGE n;
 * LUMRA_NULL_ARGUMENT reference, measured; LUMRA_OUT_OF_RANGE streams of more than 2^62 samples;
 * LUMRA_TRANSFORM_FAILED. */
LUMRA_EXPORT lumra_status lumra_evm_meter_add(lumra_evm_meter *meter, const void *reference, const void *measured,
                                              uint64_t n);

/* Joins two neighbours: `meter` is then what it would be if it had been given the samples of `next`, too. Where memory
 * runs out or a transform fails, some of them may have been.
 *
 * next  not changed; made with the same options but for the start, which is the position behind the last sample of
 *       `meter`
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT, LUMRA_WRONG_OBJECT meter; the same for next;
 * LUMRA_OVERLAP where both are one; LUMRA_WRONG_TYPE options; LUMRA_OUT_OF_RANGE start of `next`;
 * LUMRA_TRANSFORM_FAILED. One thread at a time for either object. */
LUMRA_EXPORT lumra_status lumra_evm_meter_merge(lumra_evm_meter *meter, const lumra_evm_meter *next);

/* Where a meter stands. */
typedef struct lumra_evm_meter_extent {
  uint64_t start;   /* position of the first samples */
  uint64_t samples; /* added of either stream */
  int32_t type;     /* of the samples */
  int32_t reserved; /* 0 */
} lumra_evm_meter_extent;

/* Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT meter; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT
 * extent. */
LUMRA_EXPORT lumra_status lumra_evm_meter_where(const lumra_evm_meter *meter, lumra_evm_meter_extent *extent);

/* Reads the figures of the samples so far under the meter's model; the meter goes on unchanged. `first` and
 * `peak_index` are positions in the streams.
 *
 * result  written; its size is set by the caller
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT meter; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT result;
 * LUMRA_BAD_SIZE_FIELD result; LUMRA_TOO_FEW_SAMPLES where none is compared; LUMRA_OUT_OF_RANGE a reference of zeros;
 * LUMRA_TRANSFORM_FAILED. */
LUMRA_EXPORT lumra_status lumra_evm_meter_read(const lumra_evm_meter *meter, lumra_evm_result *result);

/* Gives the model that fits the samples so far better, by one step of least squares; the meter goes on unchanged. The
 * model must be near: its delay to a sample, its frequency to a fifth of a turn over the samples.
 *
 * refinement  written; its size is set by the caller
 *
 * Returns what lumra_evm_meter_read returns in that order, and before LUMRA_TRANSFORM_FAILED: LUMRA_NO_CONVERGENCE as
 * lumra_evm_measure_*. */
LUMRA_EXPORT lumra_status lumra_evm_meter_refine(const lumra_evm_meter *meter, lumra_evm_refinement *refinement);

/* Bytes of a saved state. Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT meter; LUMRA_WRONG_OBJECT;
 * LUMRA_NULL_ARGUMENT size. */
LUMRA_EXPORT lumra_status lumra_evm_meter_state_size(const lumra_evm_meter *meter, uint64_t *size);

/* Saves the meter with its options.
 *
 * bytes  lumra_evm_meter_state_size bytes are written
 * room   of bytes
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT meter; LUMRA_WRONG_OBJECT; LUMRA_TOO_LITTLE_ROOM;
 * LUMRA_NULL_ARGUMENT bytes. */
LUMRA_EXPORT lumra_status lumra_evm_meter_save(const lumra_evm_meter *meter, void *bytes, uint64_t room);

/* Makes the meter that was saved.
 *
 * bytes  `size` bytes that lumra_evm_meter_save wrote
 * meter  the object's address is written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT meter, bytes; LUMRA_BAD_STATE. */
LUMRA_EXPORT lumra_status lumra_evm_meter_load(const void *bytes, uint64_t size, lumra_evm_meter **meter);

/* Frees the object; null is none. */
LUMRA_EXPORT void lumra_evm_meter_free(lumra_evm_meter *meter);

/* The errors of n samples under a known model, in units of the reference. With the samples of a meter's window, these
 * are those that the meter sums over the window's block: block k has the samples from k LUMRA_EVM_BLOCK on, and its
 * window begins 8192 samples before, or at 0 where k is 0.
 *
 * options    of a meter that would take the samples
 * reference  n samples of options->type
 * measured   n samples of options->type
 * error      receives n error vectors, complex, or null
 * magnitude  receives n differences of magnitudes, real, or null
 * phase      receives n differences of phases in radians, real, or null. All three have the precision of the type, are
 *            NaN where the reference is not known, and lie apart from each other and from the inputs
 *
 * n is at least 1, and at most LUMRA_EVM_WINDOW where the model has a delay.
 *
 * Returns 0, or in the order of the checks: those of lumra_evm_meter_create; LUMRA_OUT_OF_RANGE n; LUMRA_NULL_ARGUMENT
 * reference, measured; LUMRA_OVERLAP; LUMRA_TOO_FEW_SAMPLES; LUMRA_TRANSFORM_FAILED. Any thread. */
LUMRA_EXPORT lumra_status lumra_evm_errors(const lumra_evm_meter_options *options, const void *reference,
                                           const void *measured, uint64_t n, void *error, void *magnitude, void *phase);

#ifdef __cplusplus
}
#endif

#endif
