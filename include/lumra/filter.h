/* Filters of streams, convolution and correlation of records, and filter designs. SPDX-License-Identifier: MIT
 *
 * Conventions of the open interface: lumra/lumra.h. */
#ifndef LUMRA_FILTER_H
#define LUMRA_FILTER_H

#include <lumra/export.h>
#include <lumra/filter_recursive.h>
#include <lumra/status.h>
#include <lumra/types.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* How sums of products are computed. Directly, they are added from the first product to the last. Through Fourier
 * transforms, they are as exact relative to the largest values around them, and a NaN or infinity spoils all results of
 * its block. LUMRA_METHOD_AUTO takes what should be faster, by the number of multiplications of each way and what one
 * of them takes, as it was measured. */
enum lumra_method { LUMRA_METHOD_AUTO = 0, LUMRA_METHOD_DIRECT = 1, LUMRA_METHOD_FOURIER = 2 };

/* ---- Filters with a finite response (FIR)
 *
 * out[k] = sum over j = 0 ... count - 1 of taps[j] x[k - j]; before the stream's first sample there was silence. There
 * are as many outputs as samples at once, however few: nothing is delayed.
 *
 * Up to 64 taps, and with LUMRA_METHOD_DIRECT, outputs have the same bits however the stream is cut into calls, and
 * LUMRA_METHOD_AUTO is direct. With more taps it takes blocks through transforms (overlap-save) where these are faster;
 * outputs are then within rounding of those of any other cut. A long call costs two transforms a block; a short one
 * adds its samples directly to what the latest block left for outputs to come, until another block is cheaper. So no
 * sample costs more than in the direct filter, and no call more than two transforms for each block that it begins. A
 * filter by transforms holds four of their lengths in samples, each 2 to 8 times the taps where these are many. */
typedef struct lumra_fir lumra_fir;

typedef struct lumra_fir_options {
  uint32_t size;     /* of this record in bytes */
  int32_t type;      /* of samples: LUMRA_TYPE_F32, _F64, _CF32 or _CF64 (enum lumra_type_code) */
  int32_t taps_type; /* type, or the real one of the same precision: LUMRA_TYPE_F32 or _F64; 0: the real one */
  int32_t method;    /* one of enum lumra_method */
} lumra_fir_options;

#define LUMRA_FIR_OPTIONS \
  { sizeof(lumra_fir_options), LUMRA_TYPE_CF32, 0, LUMRA_METHOD_AUTO }

/* Makes a filter.
 *
 * options  null: LUMRA_FIR_OPTIONS
 * taps     `count` elements of taps_type, which are copied
 * count    1 to 2^24
 * fir      the object's address is written here
 *
 * Returns 0, or in the order of the checks: LUMRA_BAD_SIZE_FIELD options->size; LUMRA_UNKNOWN_CHOICE type, taps_type,
 * method; LUMRA_OUT_OF_RANGE count; LUMRA_NULL_ARGUMENT taps, fir; LUMRA_TRANSFORM_FAILED. */
LUMRA_EXPORT lumra_status lumra_fir_create(const lumra_fir_options *options, const void *taps, uint64_t count,
                                           lumra_fir **fir);

/* Filters the stream's next n samples. No memory is allocated.
 *
 * in   n samples
 * out  room for n samples; in place: may be `in`
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT fir; LUMRA_WRONG_OBJECT; LUMRA_OUT_OF_RANGE n and
 * LUMRA_NULL_ARGUMENT in, then out; LUMRA_OVERLAP; LUMRA_TRANSFORM_FAILED, after which part of the outputs may have
 * been written and lumra_fir_reset must be called. */
LUMRA_EXPORT lumra_status lumra_fir_process(lumra_fir *fir, const void *in, void *out, uint64_t n);

/* Begins a new stream.
 *
 * Returns 0, LUMRA_NULL_ARGUMENT or LUMRA_WRONG_OBJECT. */
LUMRA_EXPORT lumra_status lumra_fir_reset(lumra_fir *fir);

/* The type of the filter's samples.
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT fir; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT type. */
LUMRA_EXPORT lumra_status lumra_fir_get_type(const lumra_fir *fir, int32_t *type);

/* Bytes of a saved filter: 56, `count` taps and count - 1 samples.
 *
 * size  written
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT fir; LUMRA_WRONG_OBJECT; LUMRA_NULL_ARGUMENT size. */
LUMRA_EXPORT lumra_status lumra_fir_state_size(const lumra_fir *fir, uint64_t *size);

/* Saves the filter: its options, its taps and the stream's latest samples.
 *
 * bytes  lumra_fir_state_size bytes are written
 * room   of bytes
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT fir; LUMRA_WRONG_OBJECT; LUMRA_TOO_LITTLE_ROOM;
 * LUMRA_NULL_ARGUMENT bytes. */
LUMRA_EXPORT lumra_status lumra_fir_save(const lumra_fir *fir, void *bytes, uint64_t room);

/* Makes a filter that goes on where a saved one was, as if the stream had been cut there.
 *
 * bytes  `size` bytes that lumra_fir_save wrote
 * fir    the object's address is written here
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT fir, bytes; LUMRA_BAD_STATE; LUMRA_TRANSFORM_FAILED. */
LUMRA_EXPORT lumra_status lumra_fir_load(const void *bytes, uint64_t size, lumra_fir **fir);

/* Frees the filter; null is none. */
LUMRA_EXPORT void lumra_fir_free(lumra_fir *fir);

/* ---- Convolution and correlation of whole records */

/* Which part of the full result, nx + ny - 1 elements, is kept. */
enum lumra_mode {
  LUMRA_MODE_FULL = 0, /* all */
  LUMRA_MODE_SAME = 1, /* nx elements around the middle, from element (ny - 1) / 2, rounded down */
  LUMRA_MODE_VALID = 2 /* those that all elements of the shorter record enter: |nx - ny| + 1 */
};

/* Elements that a convolution or correlation writes.
 *
 * nx, ny  1 or more, together at most 2^58
 * count   written
 *
 * Returns 0, or in the order of the checks: LUMRA_OUT_OF_RANGE nx, ny; LUMRA_UNKNOWN_CHOICE mode; LUMRA_NULL_ARGUMENT
 * count. */
LUMRA_EXPORT lumra_status lumra_convolve_size(uint64_t nx, uint64_t ny, int32_t mode, uint64_t *count);

/* Convolves: element k of the full result is the sum over j of x[j] y[k - j].
 *
 * x, y    nx and ny elements, 1 or more each; they may be the same or overlap
 * mode    one of enum lumra_mode
 * method  one of enum lumra_method; with LUMRA_METHOD_FOURIER the shorter record has at most 2^26 elements
 * out     lumra_convolve_size elements are written; apart from x and y
 * room    of out in elements
 *
 * Records of unlike lengths go through transforms in blocks. Single precision is computed in single precision.
 *
 * Returns 0, or in the order of the checks: LUMRA_OUT_OF_RANGE nx, ny; LUMRA_UNKNOWN_CHOICE mode, method;
 * LUMRA_OUT_OF_RANGE a record too long for its method; LUMRA_NULL_ARGUMENT x, y; LUMRA_TOO_LITTLE_ROOM;
 * LUMRA_NULL_ARGUMENT out; LUMRA_OVERLAP; LUMRA_TRANSFORM_FAILED. Any thread. */
LUMRA_EXPORT lumra_status lumra_convolve_f32(const float *x, uint64_t nx, const float *y, uint64_t ny, int32_t mode,
                                             int32_t method, float *out, uint64_t room);
LUMRA_EXPORT lumra_status lumra_convolve_f64(const double *x, uint64_t nx, const double *y, uint64_t ny, int32_t mode,
                                             int32_t method, double *out, uint64_t room);
LUMRA_EXPORT lumra_status lumra_convolve_cf32(const lumra_cf32 *x, uint64_t nx, const lumra_cf32 *y, uint64_t ny,
                                              int32_t mode, int32_t method, lumra_cf32 *out, uint64_t room);
LUMRA_EXPORT lumra_status lumra_convolve_cf64(const lumra_cf64 *x, uint64_t nx, const lumra_cf64 *y, uint64_t ny,
                                              int32_t mode, int32_t method, lumra_cf64 *out, uint64_t room);

/* The same with real y, which takes half the time or less where y is the shorter record. */
LUMRA_EXPORT lumra_status lumra_convolve_with_real_cf32(const lumra_cf32 *x, uint64_t nx, const float *y, uint64_t ny,
                                                        int32_t mode, int32_t method, lumra_cf32 *out, uint64_t room);
LUMRA_EXPORT lumra_status lumra_convolve_with_real_cf64(const lumra_cf64 *x, uint64_t nx, const double *y, uint64_t ny,
                                                        int32_t mode, int32_t method, lumra_cf64 *out, uint64_t room);

/* Correlates: element k of the full result is the sum over j of x[j] conj(y[j - k + ny - 1]), the lag k - (ny - 1) of x
 * behind y. Arguments, sizes and statuses are those of the convolution. */
LUMRA_EXPORT lumra_status lumra_correlate_f32(const float *x, uint64_t nx, const float *y, uint64_t ny, int32_t mode,
                                              int32_t method, float *out, uint64_t room);
LUMRA_EXPORT lumra_status lumra_correlate_f64(const double *x, uint64_t nx, const double *y, uint64_t ny, int32_t mode,
                                              int32_t method, double *out, uint64_t room);
LUMRA_EXPORT lumra_status lumra_correlate_cf32(const lumra_cf32 *x, uint64_t nx, const lumra_cf32 *y, uint64_t ny,
                                               int32_t mode, int32_t method, lumra_cf32 *out, uint64_t room);
LUMRA_EXPORT lumra_status lumra_correlate_cf64(const lumra_cf64 *x, uint64_t nx, const lumra_cf64 *y, uint64_t ny,
                                               int32_t mode, int32_t method, lumra_cf64 *out, uint64_t room);

/* ---- Designs of taps */

/* A low pass by Kaiser's window, symmetric, with gain 1 at 0 Hz. Taps are the fewest, within a few in a hundred, with
 * which the realised response keeps the rejection: beyond stop_edge the gain is at most 10^(-rejection / 20), and up to
 * pass_edge it differs from 1 by at most as much. The rounding of taps in single precision ends that at some 140 dB.
 *
 * sample_rate  in Hz, above 0
 * pass_edge    in Hz, 0 or more
 * stop_edge    in Hz, above pass_edge, at most sample_rate / 2
 * rejection    in dB, 20 to 200
 * count        of taps: written
 *
 * The designs of _count and of the functions with the same arguments are the same; more than 2^24 taps are refused.
 *
 * Returns 0, or in the order of the checks: LUMRA_OUT_OF_RANGE sample_rate, pass_edge, stop_edge, rejection, the number
 * of taps; LUMRA_NULL_ARGUMENT count. */
LUMRA_EXPORT lumra_status lumra_design_kaiser_lowpass_count(double sample_rate, double pass_edge, double stop_edge,
                                                            double rejection, uint64_t *count);

/* Writes that filter's taps.
 *
 * taps  the number that lumra_design_kaiser_lowpass_count gives is written
 * room  of taps in elements
 *
 * Returns 0, or in the order of the checks: LUMRA_OUT_OF_RANGE as above; LUMRA_TOO_LITTLE_ROOM; LUMRA_NULL_ARGUMENT
 * taps. */
LUMRA_EXPORT lumra_status lumra_design_kaiser_lowpass_f32(double sample_rate, double pass_edge, double stop_edge,
                                                          double rejection, float *taps, uint64_t room);
LUMRA_EXPORT lumra_status lumra_design_kaiser_lowpass_f64(double sample_rate, double pass_edge, double stop_edge,
                                                          double rejection, double *taps, uint64_t room);

/* A root raised cosine, symmetric, with energy 1 (the sum of the squared taps): two of them in a row have no
 * interference between symbols, but for what the span cuts off.
 *
 * sample_rate  in Hz, above 0
 * symbol_rate  in Hz, above 0, at most sample_rate
 * roll_off     0 to 1
 * span         length in symbols, above 0; there are round(span sample_rate / symbol_rate) + 1 taps
 * count        of taps: written
 *
 * Returns 0, or in the order of the checks: LUMRA_OUT_OF_RANGE sample_rate, symbol_rate, roll_off, span, more than 2^24
 * taps; LUMRA_NULL_ARGUMENT count. */
LUMRA_EXPORT lumra_status lumra_design_root_raised_cosine_count(double sample_rate, double symbol_rate, double roll_off,
                                                                double span, uint64_t *count);

/* Writes that filter's taps, with arguments and statuses as for lumra_design_kaiser_lowpass_f32. */
LUMRA_EXPORT lumra_status lumra_design_root_raised_cosine_f32(double sample_rate, double symbol_rate, double roll_off,
                                                              double span, float *taps, uint64_t room);
LUMRA_EXPORT lumra_status lumra_design_root_raised_cosine_f64(double sample_rate, double symbol_rate, double roll_off,
                                                              double span, double *taps, uint64_t room);

#ifdef __cplusplus
}
#endif

#endif
