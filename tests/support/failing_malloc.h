/* Control of failing_malloc.c from inside the process. SPDX-License-Identifier: MIT */
#ifndef FAILING_MALLOC_H
#define FAILING_MALLOC_H

#ifdef __cplusplus
extern "C" {
#endif

/* Counts the allocations of all threads from here on. The first-th one (from 1; 0 for none) and those after it fail,
 * `count` of them or, for 0, all. */
void failing_malloc_arm(long first, long count);
/* Every allocation succeeds again; how many were tried since failing_malloc_arm. */
long failing_malloc_disarm(void);
/* Blocks that the process holds. */
long failing_malloc_live(void);

#ifdef __cplusplus
}
#endif

#endif
