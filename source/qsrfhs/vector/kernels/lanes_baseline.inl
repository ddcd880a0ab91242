// f8, eight floats, in two SSE2 registers. SPDX-License-Identifier: MIT

struct f8 {
  __m128 low, high;
};

static inline f8 load(const float *p) {
  return {_mm_loadu_ps(p), _mm_loadu_ps(p + 4)};
}
static inline void store(float *p, f8 a) {
  _mm_storeu_ps(p, a.low);
  _mm_storeu_ps(p + 4, a.high);
}
static inline f8 broadcast(float a) {
  return {_mm_set1_ps(a), _mm_set1_ps(a)};
}
static inline f8 operator+(f8 a, f8 b) {
  return {_mm_add_ps(a.low, b.low), _mm_add_ps(a.high, b.high)};
}
static inline f8 operator*(f8 a, f8 b) {
  return {_mm_mul_ps(a.low, b.low), _mm_mul_ps(a.high, b.high)};
}

/// Eight complex values in a and b (four each) to eight real and eight imaginary parts, in the order 0 to 7.
static inline void split_in_lanes(f8 a, f8 b, f8 &re, f8 &im) {
  re = {_mm_shuffle_ps(a.low, a.high, 0x88), _mm_shuffle_ps(b.low, b.high, 0x88)};
  im = {_mm_shuffle_ps(a.low, a.high, 0xdd), _mm_shuffle_ps(b.low, b.high, 0xdd)};
}

/// The order of split_in_lanes back to 0 to 7.
static inline f8 order_lanes(f8 a) {
  return a;
}

/// Four floats, each twice: p0 p0 p1 p1 p2 p2 p3 p3.
static inline f8 load_twice(const float *p) {
  const __m128 a = _mm_loadu_ps(p);
  return {_mm_unpacklo_ps(a, a), _mm_unpackhi_ps(a, a)};
}
