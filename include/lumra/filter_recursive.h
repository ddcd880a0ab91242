/* Recursive filters over streams; part of filter.h. SPDX-License-Identifier: MIT
 *
 *   y[n] = (b[0] x[n] + ... + b[M] x[n - M] - a[1] y[n - 1] - ... - a[N] y[n - N]) / a[0]
 *
 * in direct form, or as sections of second order behind each other, which stay exact where a direct form of high order
 * does not. Coefficients are real, in double precision, and all sums are, whatever the samples are; complex samples are
 * filtered part by part. The results are those of scipy.signal's lfilter and sosfilt within rounding, and the same bits
 * however the stream is cut.
 *
 * Two methods: in order, sample by sample; and in blocks of eight samples from a state in front of them, several times
 * as fast. LUMRA_IIR_AUTO takes blocks where a trial in lumra_iir_create shows them to be about as exact: on 2048
 * samples of noise their root-mean-square error against extended precision must be below four times that of the filter
 * in order, or below 2^-30 (single precision) or 2^-52 (double) of the output. Nearly all filters of up to 16
 * coefficients behind a[0] so go in blocks, narrow ones included; filters whose outputs grow beyond all numbers in the
 * trial do not. What is left of a sound below 1e-290 counts as 0 for what follows. A sample that is not finite spoils
 * its own output and those that follow, none in front of it; lumra_iir_reset makes the filter usable again. */
#ifndef LUMRA_FILTER_RECURSIVE_H
#define LUMRA_FILTER_RECURSIVE_H

#include <lumra/export.h>
#include <lumra/status.h>
#include <lumra/types.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct lumra_iir lumra_iir;

enum lumra_iir_method { LUMRA_IIR_AUTO = 0, LUMRA_IIR_IN_ORDER = 1, LUMRA_IIR_BLOCKS = 2 };

typedef struct lumra_iir_options {
  uint32_t size;  /* of this record in bytes */
  int32_t type;   /* of the samples: one of enum lumra_type_code */
  int32_t method; /* one of enum lumra_iir_method; blocks need 16 or fewer coefficients behind a[0] in each stage;
                     where outputs leave all numbers within 64 samples, they go in order after all */
} lumra_iir_options;

#define LUMRA_IIR_OPTIONS \
  { sizeof(lumra_iir_options), LUMRA_TYPE_CF32, LUMRA_IIR_AUTO }

/* Makes a filter in direct form, at rest.
 *
 * options  null for LUMRA_IIR_OPTIONS
 * b        b_count forward coefficients, 1 to 65536
 * a        a_count reverse coefficients, 1 to 65536; a[0] is not 0
 * out      receives the filter
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT out; LUMRA_BAD_SIZE_FIELD options; LUMRA_UNKNOWN_CHOICE
 * type, method; LUMRA_OUT_OF_RANGE b_count, a_count; LUMRA_NULL_ARGUMENT b, a; LUMRA_OUT_OF_RANGE a coefficient that is
 * not finite, also once divided by a[0]; a[0] of 0; too many coefficients for blocks. */
LUMRA_EXPORT lumra_status lumra_iir_create(const lumra_iir_options *options, const double *b, uint64_t b_count,
                                           const double *a, uint64_t a_count, lumra_iir **out);

/* Makes a filter of sections of second order.
 *
 * sections  count times b[0], b[1], b[2], a[0], a[1], a[2], the first section first
 * count     1 to 4096
 *
 * Returns as lumra_iir_create does, with count and sections in the place of the coefficients. */
LUMRA_EXPORT lumra_status lumra_iir_create_sections(const lumra_iir_options *options, const double *sections,
                                                    uint64_t count, lumra_iir **out);

/* Frees a filter; null is allowed. */
LUMRA_EXPORT void lumra_iir_free(lumra_iir *filter);

/* Filters the stream's next n samples; n outputs. Allocates nothing.
 *
 * in   n samples of the filter's type
 * out  n samples; may be `in` (in place)
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT, LUMRA_WRONG_OBJECT filter; LUMRA_OUT_OF_RANGE n;
 * LUMRA_NULL_ARGUMENT in, out; LUMRA_OVERLAP. */
LUMRA_EXPORT lumra_status lumra_iir_process(lumra_iir *filter, const void *in, void *out, uint64_t n);

/* Puts the filter back to rest. Returns 0, LUMRA_NULL_ARGUMENT or LUMRA_WRONG_OBJECT. */
LUMRA_EXPORT lumra_status lumra_iir_reset(lumra_iir *filter);

/* The type of the filter's samples, and the method that it uses: LUMRA_IIR_IN_ORDER or LUMRA_IIR_BLOCKS. Codes as
 * lumra_iir_reset, then LUMRA_NULL_ARGUMENT for the result. */
LUMRA_EXPORT lumra_status lumra_iir_get_type(const lumra_iir *filter, int32_t *type);
LUMRA_EXPORT lumra_status lumra_iir_get_method(const lumra_iir *filter, int32_t *method);

/* The state of the transposed direct form II, as scipy.signal's zi: max(M, N) values of the samples' kind in double
 * precision (double, or lumra_cf64 for complex samples), for sections two values a section. A state that is set makes
 * the stream begin anew, with what the state adds to the first outputs.
 *
 * state  read or written
 * count  its values; exactly those that there are, see lumra_iir_order
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT, LUMRA_WRONG_OBJECT filter; LUMRA_OUT_OF_RANGE count;
 * LUMRA_NULL_ARGUMENT state (unless count is 0). */
LUMRA_EXPORT lumra_status lumra_iir_get_state(const lumra_iir *filter, void *state, uint64_t count);
LUMRA_EXPORT lumra_status lumra_iir_set_state(lumra_iir *filter, const void *state, uint64_t count);

/* The number of values of the state. Codes as lumra_iir_reset, then LUMRA_NULL_ARGUMENT order. */
LUMRA_EXPORT lumra_status lumra_iir_order(const lumra_iir *filter, uint64_t *order);

/* Saves a filter with its coefficients and all that its stream continues from, and makes one from saved bytes: the same
 * bits follow from both. lumra_iir_state_size has the codes of lumra_iir_reset, then LUMRA_NULL_ARGUMENT size.
 *
 * bytes  at least lumra_iir_state_size bytes to write, room of them; or size saved bytes
 *
 * Return 0, or in the order of the checks: LUMRA_NULL_ARGUMENT, LUMRA_WRONG_OBJECT filter; LUMRA_TOO_LITTLE_ROOM;
 * LUMRA_NULL_ARGUMENT bytes. For loading: LUMRA_NULL_ARGUMENT out, bytes; LUMRA_BAD_STATE. */
LUMRA_EXPORT lumra_status lumra_iir_state_size(const lumra_iir *filter, uint64_t *size);
LUMRA_EXPORT lumra_status lumra_iir_save(const lumra_iir *filter, void *bytes, uint64_t room);
LUMRA_EXPORT lumra_status lumra_iir_load(const void *bytes, uint64_t size, lumra_iir **out);

#ifdef __cplusplus
}
#endif

#endif
