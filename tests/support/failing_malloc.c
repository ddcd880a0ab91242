/* Memory that runs out on demand, for whole processes: replaces malloc and its kin, also for the C and C++ runtimes and
 * MKL. Linked into an executable it is driven by failing_malloc.h. Preloaded (LD_PRELOAD, target lumra_failing_malloc)
 * into a program as it is, it reads LUMRA_FAIL_AT, the number of the first allocation that fails, counted from 1 when
 * all libraries have been initialised; LUMRA_FAIL_COUNT, how many fail from there on (1 without it, 0 for all); and
 * LUMRA_FAIL_REPORT, a file that gets the number of allocations when the process exits: below LUMRA_FAIL_AT, none
 * failed. Any of the three switches counting on. SPDX-License-Identifier: MIT */
#define _DEFAULT_SOURCE /* valloc */

#include "failing_malloc.h"

#include <errno.h>
#include <fcntl.h>
#include <malloc.h>
#include <stdatomic.h>
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <unistd.h>

/* The C library's own, under the names that nobody replaces. */
void *__libc_malloc(size_t);
void *__libc_calloc(size_t, size_t);
void *__libc_realloc(void *, size_t);
void *__libc_memalign(size_t, size_t);
void __libc_free(void *);

static atomic_bool armed;
static atomic_long calls, live;
static long first_failing, failing_count;

void failing_malloc_arm(long first, long count) {
  first_failing = first;
  failing_count = count;
  calls = 0;
  armed = 1;
}

long failing_malloc_disarm(void) {
  armed = 0;
  return calls;
}

long failing_malloc_live(void) {
  return live;
}

static int fails(void) {
  long call;
  if (!armed) return 0;
  call = ++calls;
  if (first_failing <= 0 || call < first_failing) return 0;
  return failing_count == 0 || call - first_failing < failing_count;
}

static void *made(void *block) {
  if (block) ++live;
  return block;
}

static void *refuse(void) {
  errno = ENOMEM;
  return NULL;
}

#pragma GCC visibility push(default) /* all libraries are to find these */

void *malloc(size_t size) {
  return fails() ? refuse() : made(__libc_malloc(size));
}
void *calloc(size_t count, size_t size) {
  return fails() ? refuse() : made(__libc_calloc(count, size));
}
void *memalign(size_t alignment, size_t size) {
  return fails() ? refuse() : made(__libc_memalign(alignment, size));
}
void *aligned_alloc(size_t alignment, size_t size) {
  return memalign(alignment, size);
}
void *valloc(size_t size) {
  return memalign((size_t)sysconf(_SC_PAGESIZE), size);
}

int posix_memalign(void **block, size_t alignment, size_t size) {
  void *const allocated = memalign(alignment, size);
  if (!allocated) return ENOMEM;
  *block = allocated;
  return 0;
}

void *realloc(void *block, size_t size) {
  if (!block) return malloc(size);
  if (size == 0) { /* frees */
    free(block);
    return NULL;
  }
  if (fails()) return refuse();
  return __libc_realloc(block, size);
}

void free(void *block) {
  if (block) --live;
  __libc_free(block);
}

#pragma GCC visibility pop

__attribute__((constructor)) static void begin(void) {
  const char *at = getenv("LUMRA_FAIL_AT"), *count = getenv("LUMRA_FAIL_COUNT");
  if (at || getenv("LUMRA_FAIL_REPORT")) failing_malloc_arm(at ? atol(at) : 0, count ? atol(count) : 1);
}

__attribute__((destructor)) static void end(void) {
  const char *report = getenv("LUMRA_FAIL_REPORT");
  char text[24];
  const int length = snprintf(text, sizeof text, "%ld\n", failing_malloc_disarm());
  const int file = report ? open(report, O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600) : -1;
  if (file < 0) return;
  if (write(file, text, (size_t)length) != length) perror(report);
  close(file);
}
