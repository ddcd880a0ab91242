// f8, eight floats, in one AVX register. Only what AVX itself has: no AVX2, no FMA. SPDX-License-Identifier: MIT

struct f8 {
  __m256 v;
};

static inline f8 load(const float *p) {
  return {_mm256_loadu_ps(p)};
}
static inline void store(float *p, f8 a) {
  _mm256_storeu_ps(p, a.v);
}
static inline f8 broadcast(float a) {
  return {_mm256_set1_ps(a)};
}
static inline f8 operator+(f8 a, f8 b) {
  return {_mm256_add_ps(a.v, b.v)};
}
static inline f8 operator*(f8 a, f8 b) {
  return {_mm256_mul_ps(a.v, b.v)};
}

/// Eight complex values in a and b (four each) to eight real and eight imaginary parts, in the order 0 1 4 5 2 3 6 7.
static inline void split_in_lanes(f8 a, f8 b, f8 &re, f8 &im) {
  re = {_mm256_shuffle_ps(a.v, b.v, 0x88)};
  im = {_mm256_shuffle_ps(a.v, b.v, 0xdd)};
}

/// The order of split_in_lanes back to 0 to 7.
static inline f8 order_lanes(f8 a) {
  const __m256d pairs = _mm256_castps_pd(a.v);
  const __m256d swapped = _mm256_permute2f128_pd(pairs, pairs, 1);
  const __m256d low = _mm256_unpacklo_pd(pairs, swapped), high = _mm256_unpackhi_pd(pairs, swapped);
  return {_mm256_castpd_ps(_mm256_permute2f128_pd(low, high, 0x20))};
}

/// Four floats, each twice: p0 p0 p1 p1 p2 p2 p3 p3.
static inline f8 load_twice(const float *p) {
  const __m256 both = _mm256_broadcast_ps(reinterpret_cast<const __m128 *>(p));
  return {_mm256_permutevar_ps(both, _mm256_setr_epi32(0, 0, 1, 1, 2, 2, 3, 3))};
}
