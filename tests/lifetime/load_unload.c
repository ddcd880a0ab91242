/* A host that does not link the library loads it with local symbols and unloads it, 200 times, and measures each time.
 * Argument: the library's file. SPDX-License-Identifier: MIT */
#include <dlfcn.h>
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>

/* The C standard has no cast from an object pointer to a function pointer; POSIX wants it this way. */
#define FUNCTION(type, name, library) \
  type name;                          \
  *(void **)&name = dlsym(library, "qsLumraAlgo_" #name)

typedef int32_t (*create_function)(uint64_t *);
typedef int32_t (*close_function)(uint64_t);
typedef int32_t (*fft_function)(uint64_t, int32_t);

int main(int argc, char **argv) {
  int round;
  if (argc < 2) return EXIT_FAILURE;
  /* A value that the library is to replace while it is loaded and to put back when the process ends. */
  setenv("KMP_DUPLICATE_LIB_OK", "no", 1);
  for (round = 1; round <= 200; ++round) {
    uint64_t session = 0;
    void *library = dlopen(argv[1], RTLD_NOW | RTLD_LOCAL);
    if (!library) {
      fprintf(stderr, "%s\n", dlerror());
      return EXIT_FAILURE;
    }
    {
      FUNCTION(create_function, CreateSession, library);
      FUNCTION(fft_function, InitializeFFT, library);
      FUNCTION(close_function, CloseSession, library);
      if (CreateSession(&session) != 0 || InitializeFFT(session, 1000 + round) != 0 || CloseSession(session) != 0 ||
          session != (uint64_t)round) { /* handles go on: the library was never unmapped */
        fprintf(stderr, "round %d, session %llu\n", round, (unsigned long long)session);
        return EXIT_FAILURE;
      }
    }
    dlclose(library);
  }
  return EXIT_SUCCESS;
}
