// Products that are added before they are rounded, in the registers of AVX-512. SPDX-License-Identifier: MIT

/// a b + c.
static inline f16 multiply_add(f16 a, f16 b, f16 c) {
  return {_mm512_fmadd_ps(a.v, b.v, c.v)};
}
static inline d8 multiply_add(d8 a, d8 b, d8 c) {
  return {_mm512_fmadd_pd(a.v, b.v, c.v)};
}
/// a b - c.
static inline f16 multiply_subtract(f16 a, f16 b, f16 c) {
  return {_mm512_fmsub_ps(a.v, b.v, c.v)};
}
static inline d8 multiply_subtract(d8 a, d8 b, d8 c) {
  return {_mm512_fmsub_pd(a.v, b.v, c.v)};
}
/// a b - c in even lanes, a b + c in odd ones.
static inline f16 multiply_subtract_and_add(f16 a, f16 b, f16 c) {
  return {_mm512_fmaddsub_ps(a.v, b.v, c.v)};
}
static inline d8 multiply_subtract_and_add(d8 a, d8 b, d8 c) {
  return {_mm512_fmaddsub_pd(a.v, b.v, c.v)};
}
