/* Filters by key: designed once, shared, and kept for the next who asks. SPDX-License-Identifier: MIT
 *
 * A filter is registered under a key; who registers an equal key shares it. Filters without references are kept until
 * together with the others they exceed 134217728 bytes, an entry of n coefficients counting for (n + 384) * 32; the
 * least recently used goes first. Any thread may call any function; filters are designed one at a time. */
#ifndef LUMRA_FILTER_REGISTRY_H
#define LUMRA_FILTER_REGISTRY_H

#include <lumra/export.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

enum lumra_filter_kind {
  /* Coefficients that the caller gives. The four values are the caller's own. */
  LUMRA_FILTER_GIVEN = 0,
  /* Low-pass of linear phase by Kaiser's window; values: sample rate, pass edge, stop edge in hertz, attenuation A of
   * the stop band in decibels. 0 <= pass edge < stop edge <= half the sample rate, A > 0.
   *   h[k] = 2 f sinc(2 f t) I0(b sqrt(1 - (2 t / (n - 1))^2)) / I0(b),   t = k - (n - 1) / 2
   * with f the middle of the edges over the sample rate, and with C = A + 6: b = 0.1102 (C - 8.7) above 50 dB,
   * 0.5842 (C - 21)^0.4 + 0.07886 (C - 21) above 21 dB, else 0; n = ceil(D / width) + 1 for the width of the transition
   * over the sample rate, D = (C - 7.95) / 14.36 above 21 dB, else 0.9222. (J. F. Kaiser, Nonrecursive digital filter
   * design using the I0-sinh window function, 1974. The 6 dB are for what the formulas miss by.) The stop band then
   * stays below 10^(-A / 20), and the pass band within that of 1, down to what single precision holds; up to 2 dB are
   * missing where the transition begins at 0 or ends at half the rate. */
  LUMRA_FILTER_KAISER_LOW_PASS = 1,
  /* Root raised cosine of unit energy; values: sample rate, symbol rate in hertz, roll-off a from 0 to 1, span in
   * symbols. 0 < symbol rate <= sample rate, span > 0; n = span * sample rate / symbol rate, rounded, + 1.
   *   h[k] ~ (sin(pi t (1 - a)) + 4 a t cos(pi t (1 + a))) / (pi t (1 - (4 a t)^2))
   * with t = (k - (n - 1) / 2) * symbol rate / sample rate, and its limits where the divisor is 0. (J. G. Proakis,
   * Digital Communications.) */
  LUMRA_FILTER_ROOT_RAISED_COSINE = 2
};

/* A key. Two are equal when their kinds and their four values are; a value that is NaN is equal to none. */
typedef struct lumra_filter_key {
  int32_t kind; /* LUMRA_FILTER_* */
  uint8_t unused[12];
  double values[4];
} lumra_filter_key;

/* A registered filter, to be read while it is referenced. */
typedef struct lumra_filter_entry {
  const float *coefficients; /* n, on a 32-byte boundary */
  float *state;              /* n pairs, zero at first: a delay line for whoever shares it; not used by the library */
  lumra_filter_key key;
  uint64_t n;
  uint64_t identifier; /* counts from 1, never used again */
} lumra_filter_entry;

/* A caller's reference to a filter. */
typedef struct lumra_filter_record {
  const lumra_filter_entry *entry;
  uint64_t identifier;
  uint8_t user[16]; /* the caller's own; kept with the filter when it is registered, and given back on a match */
} lumra_filter_record;

/* Takes a reference to the filter of a key, and designs it where there is none.
 *
 * filter          entry and identifier are written; the whole record is copied to the filter
 * designInput     LUMRA_FILTER_GIVEN: a lumra_f32_array with the coefficients; else not looked at
 * key             equal to those of all who share the filter
 * designArgument  number of coefficients wanted, at most 2^24 for a filter to be designed; 0: as many as the values
 *                 say, or as are given. For LUMRA_FILTER_GIVEN it is 0 or their count
 *
 * Only the key is compared: where the filter exists, input and argument are not looked at. Returns 0, or in the order
 * of the checks, both recorded: -50462874 null record; -50462898 no filter: a null key, values that make none, nothing
 * given, or no memory. */
LUMRA_EXPORT int32_t qsUtilHS_RegisterFilterSpec(lumra_filter_record *filter, const void *designInput,
                                                 const lumra_filter_key *key, uint64_t designArgument);

/* Gives a reference back (the name is spelled so). The record stays as it is, but is stale now.
 * Returns 0, or in the order of the checks, all recorded: -50462818 null record; -50462821 its entry is null or its
 * identifier 0; -50462843 no such filter, or one without references. */
LUMRA_EXPORT int32_t qsUtilHS_UnegisterFilterSpec(lumra_filter_record *filter);

/* Looks a key up.
 *
 * filter  receives the record of who registered last, and a reference, when the key is found and erase is 0
 * key     as it was registered
 * erase   not 0: the filter is found no more, and is freed with its last reference
 *
 * Returns 0; -50462794 when the filter was erased; or in the order of the checks: -50462763 null record and -50462766
 * null key, both recorded; -50462810 not found. */
LUMRA_EXPORT int32_t qsUtilHS_MatchFilterSpecErase(lumra_filter_record *filter, const lumra_filter_key *key,
                                                   int32_t erase);

#ifdef __cplusplus
}
#endif

#endif
