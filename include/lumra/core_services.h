/* Core services: the process-wide list of failures, and what the headers included here declare.
 * SPDX-License-Identifier: MIT
 *
 * Every failure of a function named qsUtilHS_ or qsRFHS_ appends its code to one list for the whole process and writes
 * one line to the standard output. The list only grows. Any thread, any time. */
#ifndef LUMRA_CORE_SERVICES_H
#define LUMRA_CORE_SERVICES_H

#include <lumra/array_store.h>
#include <lumra/data_fifo.h>
#include <lumra/export.h>
#include <lumra/fft_resampler.h>
#include <lumra/filter_registry.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Writes the number of codes in the list. Returns 0; -67371090 (recorded) when count is null. */
LUMRA_EXPORT int32_t qsrfhs_getErrorCnt(uint64_t *count);

/* Copies all codes, oldest first; the list stays.
 * capacity: room in codes, in elements; at least the current count.
 * Returns 0; -67371105 when codes is null; -67371113 when capacity is too small. Both are recorded, so that the list
 * is longer by one afterwards: read the count afresh. */
LUMRA_EXPORT int32_t qsrfhs_getErrors(int32_t *codes, uint64_t capacity);

/* Returns the number of processors that parallel work is cut for: those online when first asked, at most 32. */
LUMRA_EXPORT int32_t qsUtilHS_NumCPUs(void);

#ifdef __cplusplus
}
#endif

#endif
