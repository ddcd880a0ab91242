/* A host in C that loads the library late, with the C++ runtime and all its thread-local data, and then has no memory:
 * the first call that fails for it, in a thread that was there before. Argument: the library's file.
 * SPDX-License-Identifier: MIT */
#include <dlfcn.h>
#include <pthread.h>
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>

#include "support/failing_malloc.h"

#define FUNCTION(type, name) \
  type name;                 \
  *(void **)&name = dlsym(library, "qsLumraAlgo_" #name)

typedef int32_t (*create_function)(uint64_t *);
typedef int32_t (*fft_function)(uint64_t, int32_t);
typedef int32_t (*error_vector_function)(void *, void *, void *, int32_t);

static pthread_barrier_t loaded;
static void *library;

/* Until a measurement succeeds, one allocation more succeeds each time; all others fail. */
static void *measure(void *failures) {
  struct {
    int32_t rows, columns;
    float elements[8];
  } x = {2, 2, {1, 0, 0, 1}}, e = {2, 2, {0}}, *a = &x, *out = &e;
  long first;
  pthread_barrier_wait(&loaded);
  if (!library) return NULL;
  {
    FUNCTION(create_function, CreateSession);
    FUNCTION(fft_function, InitializeFFT);
    FUNCTION(error_vector_function, CalculateEVM2D);
    for (first = 1;; ++first) {
      uint64_t session = 0;
      int32_t created, prepared = 0, compared;
      failing_malloc_arm(first, 0);
      compared = CalculateEVM2D(&a, &a, &out, 2);
      created = CreateSession(&session);
      if (created == 0) prepared = InitializeFFT(session, 1009);
      if (failing_malloc_disarm() < first) return NULL;
      *(int *)failures += (compared != 0 && compared != -312498) || (created != 0 && created != -380122) ||
                          (prepared != 0 && prepared != -380122);
    }
  }
}

int main(int argc, char **argv) {
  pthread_t thread;
  int failures = 0;
  if (argc < 2) return EXIT_FAILURE;

  pthread_barrier_init(&loaded, NULL, 2);
  if (pthread_create(&thread, NULL, &measure, &failures) != 0) return EXIT_FAILURE;
  library = dlopen(argv[1], RTLD_NOW | RTLD_LOCAL);
  if (!library) fprintf(stderr, "%s\n", dlerror());
  pthread_barrier_wait(&loaded);
  pthread_join(thread, NULL);
  return library && failures == 0 ? EXIT_SUCCESS : EXIT_FAILURE;
}
