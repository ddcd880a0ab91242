/* Figures of power spectra: channels, occupied bandwidth, peaks, tones. SPDX-License-Identifier: MIT
 *
 * All functions take `bins` powers and what they stand for: `power` and `info` as lumra_spectrum_read gives them. Of
 * `info`, its size and sides, points (16 to 2^27), sample_rate_hz, centre_hz and noise_bandwidth_bins are read, and
 * where the header says so window and window_parameter; the others follow from these. There are N = points bins of two
 * sides, bin k at centre_hz + (k - floor(N / 2)) df, or floor(N / 2) + 1 of one side, bin k at centre_hz + k df; df is
 * sample_rate_hz / N.
 *
 * Powers are integrated: the sum of the bins, divided by noise_bandwidth_bins. They are linear, those of the samples.
 * Bin k covers its frequency +- df / 2. At the ends:
 *   two sides, N even  bin 0 is the bin of both ends, -rate / 2 and rate / 2. The band reaches from half a bin below
 *                      bin 0 to centre_hz + rate / 2, where the last half bin is the lower half of bin 0 again
 *   two sides, N odd   the bins cover centre_hz +- rate / 2
 *   one side           all power of the bins at 0 and, for N even, at rate / 2 lies in the half of them that is inside
 *                      of 0 to rate / 2. The band ends half a bin below bin 0 and half a bin above the last one
 * So the channel of all frequencies, as wide as the rate around centre_hz or from 0 to rate / 2, holds the power of all
 * bins. An edge that is beyond the band by rounding alone counts as being on its end.
 *
 * Bins that are NaN or infinite spoil the figures that they enter. A figure that does not exist is NaN.
 *
 * The checks that all functions begin with: LUMRA_NULL_ARGUMENT info; LUMRA_BAD_SIZE_FIELD info; LUMRA_UNKNOWN_CHOICE
 * sides; LUMRA_OUT_OF_RANGE points, sample_rate_hz (1e-100 to 1e100), centre_hz (to 1e100 of either sign),
 * noise_bandwidth_bins (above 0); LUMRA_OUT_OF_RANGE bins that are not as many as above; LUMRA_NULL_ARGUMENT power. Any
 * thread. Conventions of the open interface: lumra/lumra.h. */
#ifndef LUMRA_MEASURE_H
#define LUMRA_MEASURE_H

#include <lumra/export.h>
#include <lumra/spectrum.h>
#include <lumra/status.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Power of a channel. Bins at its edges count by the fraction of them that is inside.
 *
 * centre_hz      of the channel
 * bandwidth_hz   of the channel, above 0; with two sides at most the sample rate
 * channel_power  written
 *
 * Returns 0, or in the order of the checks: those of all functions; LUMRA_OUT_OF_RANGE centre_hz, bandwidth_hz, or a
 * channel that reaches beyond the band; LUMRA_NULL_ARGUMENT channel_power. */
LUMRA_EXPORT lumra_status lumra_channel_power(const double *power, uint64_t bins, const lumra_spectrum_info *info,
                                              double centre_hz, double bandwidth_hz, double *channel_power);

/* The band that leaves (1 - fraction) / 2 of the whole power below and as much above, between frequencies inside of
 * bins. Where bins without power leave a choice, it is the narrowest. Both ends lie within centre_hz +- rate / 2, or
 * from 0 to rate / 2 above centre_hz.
 *
 * fraction  above 0, to 1
 * low_hz    written; NaN where the whole power is 0 or not finite
 * high_hz   the same
 *
 * Returns 0, or in the order of the checks: those of all functions; LUMRA_OUT_OF_RANGE fraction; LUMRA_NULL_ARGUMENT
 * low_hz, high_hz. */
LUMRA_EXPORT lumra_status lumra_occupied_bandwidth(const double *power, uint64_t bins, const lumra_spectrum_info *info,
                                                   double fraction, double *low_hz, double *high_hz);

/* Powers of two channels at the same distance from a main one, relative to it. */
typedef struct lumra_adjacent {
  double lower_dbc; /* 10 log10 of the ratio; NaN where the channel reaches beyond the band */
  double upper_dbc;
} lumra_adjacent;

/* Powers of the channels beside a main channel.
 *
 * centre_hz              of the main channel
 * bandwidth_hz           of the main channel, as for lumra_channel_power
 * adjacent_bandwidth_hz  of the others; 0: as the main one
 * offsets_hz             `count` distances from centre to centre, above 0
 * adjacent               `count` records are written; apart from the other arrays
 *
 * Returns 0, or in the order of the checks: those of all functions; LUMRA_OUT_OF_RANGE centre_hz, bandwidth_hz, or a
 * main channel that reaches beyond the band; LUMRA_OUT_OF_RANGE adjacent_bandwidth_hz; LUMRA_OUT_OF_RANGE count and
 * LUMRA_NULL_ARGUMENT offsets_hz, then adjacent; LUMRA_OVERLAP adjacent; LUMRA_OUT_OF_RANGE an offset. */
LUMRA_EXPORT lumra_status lumra_adjacent_power(const double *power, uint64_t bins, const lumra_spectrum_info *info,
                                               double centre_hz, double bandwidth_hz, double adjacent_bandwidth_hz,
                                               const double *offsets_hz, uint64_t count, lumra_adjacent *adjacent);

/* The top of a line. */
typedef struct lumra_peak {
  double frequency_hz;
  double power;
} lumra_peak;

typedef struct lumra_find_peaks_options {
  uint32_t size;      /* of this record in bytes */
  uint32_t reserved;  /* 0 */
  double threshold;   /* a power, 0 or more, that peaks are above */
  double distance_hz; /* 0 or more; the bins of two peaks are at least so far apart, of closer ones the highest stays */
  double centre_hz;   /* of the span that peaks are looked for in; ignored where span_hz is 0 */
  double span_hz;     /* 0 or more; 0: the whole band */
} lumra_find_peaks_options;

#define LUMRA_FIND_PEAKS_OPTIONS \
  { sizeof(lumra_find_peaks_options), 0, 0.0, 0.0, 0.0, 0.0 }

/* Finds the highest peaks: bins that are higher than their neighbours. Equal bins side by side are one peak, of three
 * or more in their middle. The first and the last bin of two sides are neighbours; one side goes on beyond its ends as
 * the mirror of itself.
 *
 * Frequency and power come from the bin and its two neighbours by the shape of the window's main lobe: from what the
 * magnitudes of both neighbours differ by, relative to the bin's; with a lobe narrower than 2 bins to either side, from
 * the larger one. For a complex tone alone they are exact: within 1e-9 bins and 1e-9 dB in double precision with every
 * cosine window (all but Kaiser's) and any N; with Kaiser's window of any beta up to 3 N within 0.7 / N^2 bins and
 * 4.1 / N^2 dB more. The mirror of a real tone, other lines within the lobe, and noise disturb both; the offset from the
 * bin is never more than half a bin. A peak on a bin at an end of one side is not interpolated.
 *
 * info     window and window_parameter are read
 * options  null for LUMRA_FIND_PEAKS_OPTIONS
 * peaks    room for `room` records; the highest are written, highest first. Apart from power
 * count    written: the number of records that were, at most `room`
 *
 * Returns 0, or in the order of the checks: those of all functions; LUMRA_UNKNOWN_CHOICE window; LUMRA_OUT_OF_RANGE
 * window_parameter; LUMRA_BAD_SIZE_FIELD options; LUMRA_OUT_OF_RANGE reserved, threshold, distance_hz, span_hz,
 * centre_hz; LUMRA_OUT_OF_RANGE room and LUMRA_NULL_ARGUMENT peaks; LUMRA_OVERLAP peaks; LUMRA_NULL_ARGUMENT count. */
LUMRA_EXPORT lumra_status lumra_find_peaks(const double *power, uint64_t bins, const lumra_spectrum_info *info,
                                           const lumra_find_peaks_options *options, lumra_peak *peaks, uint64_t room,
                                           uint64_t *count);

/* Which line is the carrier. */
enum lumra_tone_choice {
  LUMRA_TONE_STRONGEST = 0, /* the highest bin outside of the main lobe around 0 Hz */
  LUMRA_TONE_NEAREST = 1    /* the top of the line nearest to near_hz, of bins that stand out of noise (by 11 to 15 dB,
                             * more the more bins there are), or else of what is at near_hz. Bins around 0 Hz count
                             * where near_hz is among them */
};

typedef struct lumra_tone_options {
  uint32_t size;      /* of this record in bytes */
  uint32_t harmonics; /* highest order, 1 (none) to 1000 */
  int32_t choice;     /* enum lumra_tone_choice */
  uint32_t reserved;  /* 0 */
  double near_hz;     /* in the band; ignored with LUMRA_TONE_STRONGEST */
} lumra_tone_options;

#define LUMRA_TONE_OPTIONS \
  { sizeof(lumra_tone_options), 5, LUMRA_TONE_STRONGEST, 0, 0.0 }

typedef struct lumra_tone_figures {
  double frequency_hz; /* of the carrier, as lumra_find_peaks finds it */
  double power;        /* of the carrier, integrated */
  double snr_db;       /* carrier to noise */
  double sinad_db;     /* carrier to all but carrier and 0 Hz: noise, harmonics, image and other lines */
  double thd_db;       /* harmonics to carrier, those that could be told from other lines; NaN where there is none */
  double sfdr_db;      /* carrier to the strongest other line, 0 Hz excepted */
  double spur_hz;      /* the bin of that line */
  double image_db;     /* line at the mirrored offset to carrier; NaN for one side */
  double dc_db;        /* line at 0 Hz, that is at centre_hz, to carrier */
  double enob;         /* effective bits, (sinad_db - 1.76) / 6.02 */
} lumra_tone_figures;

typedef struct lumra_harmonic {
  double frequency_hz; /* where it falls in the band */
  double level_dbc;    /* NaN where it cannot be told from another line */
} lumra_harmonic;

/* Measures a carrier, its harmonics and what else there is.
 *
 * A line is the bins up to the half width of the window's main lobe, rounded up, on both sides of its middle: as many
 * as a cosine window has terms, sqrt(1 + (beta / pi)^2) with Kaiser's. Its power is integrated over them, noise
 * included. Lines are taken in this order: carrier, 0 Hz, image, harmonics from order 2. The image is at the mirrored
 * offset of the carrier from centre_hz, harmonic k at k times the offset, wrapped into the band of two sides or folded
 * into that of one. A line whose middle lies in one already taken cannot be told from it: its level is NaN, and its
 * power counts where it was taken. Bins that two lines share count for the first. So nothing counts twice.
 *
 * Noise is the bins in none of the lines, scaled to the width of the band. sinad_db is the sum of the bins outside of
 * the carrier and of 0 Hz, with noise added for those inside. The strongest other line may be anywhere.
 *
 * A carrier off the bins leaks beyond the main lobe, which counts as noise: from a Hann window up to -32.9 dB, from a
 * rectangular one so much that it serves for carriers on a bin alone. Where there is no power, power is 0 and all other
 * figures are NaN.
 *
 * info       window and window_parameter are read
 * options    null for LUMRA_TONE_OPTIONS
 * figures    written
 * harmonics  options->harmonics - 1 records are written, from order 2; null for none. Apart from power
 * room       of harmonics
 *
 * Returns 0, or in the order of the checks: those of all functions; LUMRA_UNKNOWN_CHOICE window; LUMRA_OUT_OF_RANGE
 * window_parameter; LUMRA_BAD_SIZE_FIELD options; LUMRA_OUT_OF_RANGE harmonics; LUMRA_UNKNOWN_CHOICE choice;
 * LUMRA_OUT_OF_RANGE reserved, near_hz; LUMRA_NULL_ARGUMENT figures; LUMRA_TOO_LITTLE_ROOM where harmonics are wanted;
 * LUMRA_OVERLAP harmonics. */
LUMRA_EXPORT lumra_status lumra_tone(const double *power, uint64_t bins, const lumra_spectrum_info *info,
                                     const lumra_tone_options *options, lumra_tone_figures *figures,
                                     lumra_harmonic *harmonics, uint64_t room);

#ifdef __cplusplus
}
#endif

#endif
