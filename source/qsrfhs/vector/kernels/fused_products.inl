// Products that are added before they are rounded, in the registers of AVX. SPDX-License-Identifier: MIT

/// a b + c.
static inline f8 multiply_add(f8 a, f8 b, f8 c) {
  return {_mm256_fmadd_ps(a.v, b.v, c.v)};
}
static inline d4 multiply_add(d4 a, d4 b, d4 c) {
  return {_mm256_fmadd_pd(a.v, b.v, c.v)};
}
/// a b - c.
static inline f8 multiply_subtract(f8 a, f8 b, f8 c) {
  return {_mm256_fmsub_ps(a.v, b.v, c.v)};
}
static inline d4 multiply_subtract(d4 a, d4 b, d4 c) {
  return {_mm256_fmsub_pd(a.v, b.v, c.v)};
}
/// a b - c in even lanes, a b + c in odd ones.
static inline f8 multiply_subtract_and_add(f8 a, f8 b, f8 c) {
  return {_mm256_fmaddsub_ps(a.v, b.v, c.v)};
}
static inline d4 multiply_subtract_and_add(d4 a, d4 b, d4 c) {
  return {_mm256_fmaddsub_pd(a.v, b.v, c.v)};
}
