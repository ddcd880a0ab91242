/* A host with arrays of its own, which the library finds by the symbol HostArrayResize of the process.
 * SPDX-License-Identifier: MIT */
#include <lumra/lumra.h>
#include <stdio.h>
#include <stdlib.h>

static int calls = 0;

/* Found by name at run time; blocks of single-precision reals alone are asked for here, sizes in bytes. */
int32_t HostArrayResize(int32_t typeCode, int32_t dimensions, void *handleAddress, uint64_t newSize);
__attribute__((visibility("default"))) int32_t HostArrayResize(int32_t typeCode, int32_t dimensions,
                                                               void *handleAddress, uint64_t newSize) {
  void ***handle = handleAddress;
  void *block = realloc(**handle, sizeof(int32_t) + newSize);
  ++calls;
  if (typeCode != LUMRA_TYPE_F32 || dimensions != 1 || !block) return 1;
  **handle = block;
  return 0;
}

int main(void) {
  const int32_t n = 32;
  uint64_t session = 0;
  lumra_f32_block *powers = calloc(1, sizeof *powers);
  lumra_cf32_block *samples = calloc(1, sizeof *samples + 32 * sizeof(lumra_cf32));
  lumra_waveform in = {0.0, 1.0, NULL};
  lumra_spectrum out = {0.0, 0.0, NULL};
  int failed;

  samples->count = n;
  in.y = &samples;
  out.y = &powers;
  failed = qsLumraAlgo_CreateSession(&session) != 0 ||
           qsLumraAlgo_PerformWindowingFFTAndIQTransform(session, LUMRA_WINDOW_NONE, n, &in, &out) != 0 || calls != 1 ||
           powers->count != n;
  qsLumraAlgo_CloseSession(session);
  free(powers);
  free(samples);
  if (failed) fprintf(stderr, "the host's service was called %d times\n", calls);
  return failed ? EXIT_FAILURE : EXIT_SUCCESS;
}
