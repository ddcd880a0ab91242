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

/// Eight complex values in a and b (four each) to eight real and eight imaginary parts.
static inline void split(f8 a, f8 b, f8 &re, f8 &im) {
  const __m256 low = _mm256_permute2f128_ps(a.v, b.v, 0x20);
  const __m256 high = _mm256_permute2f128_ps(a.v, b.v, 0x31);
  re = {_mm256_shuffle_ps(low, high, 0x88)};
  im = {_mm256_shuffle_ps(low, high, 0xdd)};
}

/// Four floats, each twice: p0 p0 p1 p1 p2 p2 p3 p3.
static inline f8 load_twice(const float *p) {
  const __m256 both = _mm256_broadcast_ps(reinterpret_cast<const __m128 *>(p));
  return {_mm256_permutevar_ps(both, _mm256_setr_epi32(0, 0, 1, 1, 2, 2, 3, 3))};
}
