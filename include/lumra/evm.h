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
 * Then the model's parameters are refined together on longer and longer parts, the delay on 2^18 samples at most, the
 * others up to the whole record.
 *
 * What limits the parameters is noise. At a signal-to-noise ratio S (as a power), with n samples of a signal that fills
 * a fraction B of the band, their standard deviations are about 0.55 / (B sqrt(n S)) samples, 0.4 sample_rate / (n
 * sqrt(n S)) hertz, and 1 / sqrt(n S) of the gain. Besides, the reference is interpolated between its samples by
 * Fourier transforms, and what lay in front of it and behind it is not known. Where the outer tenth of the band is free
 * this leaves errors of about 2e-5 (1000 samples; less with more of them); a signal that fills its band to the edges is
 * taken as periodic, and if it is not, errors of about 1 / sqrt(n) are left. With a delay, 32 samples at both ends of
 * the reference (an eighth of records shorter than 256) are left out, and those without a partner. Phases are MKL's,
 * below one unit in the last place.
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
} lumra_evm_options;

#define LUMRA_EVM_OPTIONS \
  { sizeof(lumra_evm_options), LUMRA_ALIGN_NONE, 1.0 }

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
 * refused as unrelated.
 *
 * Return 0, or in the order of the checks: LUMRA_BAD_SIZE_FIELD options; LUMRA_UNKNOWN_CHOICE align; LUMRA_OUT_OF_RANGE
 * sample_rate_hz, n; LUMRA_NULL_ARGUMENT reference, measured; LUMRA_NULL_ARGUMENT, LUMRA_BAD_SIZE_FIELD result;
 * LUMRA_OVERLAP; LUMRA_TOO_FEW_SAMPLES; LUMRA_OUT_OF_RANGE a reference of zeros; LUMRA_NO_CONVERGENCE where gain, delay
 * or frequency is asked for and the recordings seem unrelated (the best alignment leaves errors of ten times the
 * reference, or no less than unrelated noise of this length would), or where what is asked for cannot be told from each
 * other (delay and phase of a reference that is a tone); LUMRA_TRANSFORM_FAILED. Any thread. */
LUMRA_EXPORT lumra_status lumra_evm_measure_cf32(const lumra_cf32 *reference, const lumra_cf32 *measured, uint64_t n,
                                                 const lumra_evm_options *options, lumra_evm_result *result,
                                                 lumra_cf32 *error, float *magnitude, float *phase);
LUMRA_EXPORT lumra_status lumra_evm_measure_cf64(const lumra_cf64 *reference, const lumra_cf64 *measured, uint64_t n,
                                                 const lumra_evm_options *options, lumra_evm_result *result,
                                                 lumra_cf64 *error, double *magnitude, double *phase);

#ifdef __cplusplus
}
#endif

#endif
