/* The interface from plain C: a host without arrays of its own measures a tone. SPDX-License-Identifier: MIT */
#include <lumra/lumra.h>
#include <stdio.h>
#include <stdlib.h>

#define CHECK(condition)                                      \
  do {                                                        \
    if (!(condition)) {                                       \
      fprintf(stderr, "line %d: %s\n", __LINE__, #condition); \
      return EXIT_FAILURE;                                    \
    }                                                         \
  } while (0)

int main(void) {
  const int32_t n = 64;
  uint64_t session = 0;
  lumra_waveform in = {0.0, 1e-3, NULL};
  lumra_spectrum out = {0.0, 0.0, NULL};
  const char *duplicates = getenv("KMP_DUPLICATE_LIB_OK");
  int32_t k;

  CHECK(duplicates && duplicates[0] == 'T');
  CHECK(qsHost_ArrayNew(LUMRA_TYPE_CF32, 1, &n, &in.y) == 0);
  for (k = 0; k < n; ++k) (*in.y)->elements[k].re = 0.5f; /* a constant: all power in the middle bin */
  CHECK(qsLumraAlgo_CreateSession(&session) == 0);
  CHECK(session == 1);
  CHECK(qsLumraAlgo_InitializeWindow(session, LUMRA_WINDOW_NONE, n) == 0);
  CHECK(qsLumraAlgo_PerformWindowingFFTAndIQTransform(session, LUMRA_WINDOW_NONE, n, &in, &out) == 0);
  CHECK((*out.y)->count == n);
  CHECK((*out.y)->elements[n / 2] == 1024.0f);
  CHECK((*out.y)->elements[0] == 0.0f);
  CHECK(out.f0 == -500.0 && out.df == 15.625);
  CHECK(qsLumraAlgo_CloseSession(session) == 0);
  CHECK(qsHost_ArrayFree(&in.y) == 0 && qsHost_ArrayFree(&out.y) == 0);
  return EXIT_SUCCESS;
}
