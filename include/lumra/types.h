/* Complex samples, and the numbers that stand for element types. SPDX-License-Identifier: MIT */
#ifndef LUMRA_TYPES_H
#define LUMRA_TYPES_H

#ifdef __cplusplus
extern "C" {
#endif

/* Complex samples: I, then Q. They lie in memory as float _Complex and double _Complex, std::complex<float> and
 * std::complex<double>, and NumPy's complex64 and complex128 do. */
typedef struct lumra_cf32 {
  float re, im;
} lumra_cf32;

typedef struct lumra_cf64 {
  double re, im;
} lumra_cf64;

/* Element types: real and complex, in single and double precision. */
enum lumra_type_code { LUMRA_TYPE_F32 = 9, LUMRA_TYPE_F64 = 10, LUMRA_TYPE_CF32 = 12, LUMRA_TYPE_CF64 = 13 };

#ifdef __cplusplus
}
#endif

#endif
