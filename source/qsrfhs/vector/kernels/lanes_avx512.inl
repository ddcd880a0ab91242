// Sixteen floats, and eight doubles, in one AVX-512 register: beside f8 and d4, what they have where the number of lanes
// is no part of the results. Comparisons give a bit for each lane. SPDX-License-Identifier: MIT

struct f16 {
  static constexpr std::size_t lanes = 16;
  __m512 v;
  static inline f16 load(const float *p) { return {_mm512_loadu_ps(p)}; }
  static inline f16 broadcast(float a) { return {_mm512_set1_ps(a)}; }
  /// Sixteen times the float with these bits.
  static inline f16 broadcast_bits(int bits) { return {_mm512_castsi512_ps(_mm512_set1_epi32(bits))}; }
  /// a b a b ...
  static inline f16 broadcast_pair(float a, float b) {
    return {_mm512_setr_ps(a, b, a, b, a, b, a, b, a, b, a, b, a, b, a, b)};
  }
  /// Eight floats, each twice.
  static inline f16 load_twice(const float *p) {
    const __m512i places = _mm512_setr_epi32(0, 0, 1, 1, 2, 2, 3, 3, 4, 4, 5, 5, 6, 6, 7, 7);
    return {_mm512_permutexvar_ps(places, _mm512_castps256_ps512(_mm256_loadu_ps(p)))};
  }
};

struct mask16 {
  __mmask16 v;
};

using wide = f16;
using wide_mask = mask16;

static inline void store(float *p, f16 a) {
  _mm512_storeu_ps(p, a.v);
}
/// Stores past the caches; p lies on a boundary of 64 bytes.
static inline void stream(float *p, f16 a) {
  _mm512_stream_ps(p, a.v);
}

static inline f16 swap_pairs(f16 a) {
  return {_mm512_permute_ps(a.v, 0xb1)};
}
static inline f16 operator+(f16 a, f16 b) {
  return {_mm512_add_ps(a.v, b.v)};
}
static inline f16 operator-(f16 a, f16 b) {
  return {_mm512_sub_ps(a.v, b.v)};
}
static inline f16 operator*(f16 a, f16 b) {
  return {_mm512_mul_ps(a.v, b.v)};
}
static inline f16 operator/(f16 a, f16 b) {
  return {_mm512_div_ps(a.v, b.v)};
}
static inline f16 square_root(f16 a) {
  return {_mm512_sqrt_ps(a.v)};
}
static inline f16 greater_of(f16 a, f16 b) {
  return {_mm512_max_ps(a.v, b.v)};
}

static inline mask16 operator>=(f16 a, f16 b) {
  return {_mm512_cmp_ps_mask(a.v, b.v, _CMP_GE_OS)};
}
static inline mask16 operator==(f16 a, f16 b) {
  return {_mm512_cmp_ps_mask(a.v, b.v, _CMP_EQ_OQ)};
}
static inline f16 operator&(f16 a, f16 b) {
  return {_mm512_and_ps(a.v, b.v)};
}
static inline f16 operator&(f16 a, mask16 b) {
  return {_mm512_maskz_mov_ps(b.v, a.v)};
}
static inline f16 operator|(f16 a, f16 b) {
  return {_mm512_or_ps(a.v, b.v)};
}
/// b without the bits of a.
static inline mask16 clear(mask16 a, mask16 b) {
  return {_kandn_mask16(a.v, b.v)};
}
static inline f16 select(mask16 mask, f16 a, f16 b) {
  return {_mm512_mask_blend_ps(mask.v, b.v, a.v)};
}

static inline f16 to_integers(f16 a) {
  return {_mm512_castsi512_ps(_mm512_cvttps_epi32(a.v))};
}
static inline f16 from_integers(f16 a) {
  return {_mm512_cvtepi32_ps(_mm512_castps_si512(a.v))};
}

/// Sixteen complex values to real and imaginary parts in their order, which costs no more here than another one.
static inline void split_in_lanes(f16 a, f16 b, f16 &re, f16 &im) {
  const __m512i even = _mm512_setr_epi32(0, 2, 4, 6, 8, 10, 12, 14, 16, 18, 20, 22, 24, 26, 28, 30);
  const __m512i odd = _mm512_setr_epi32(1, 3, 5, 7, 9, 11, 13, 15, 17, 19, 21, 23, 25, 27, 29, 31);
  re = {_mm512_permutex2var_ps(a.v, even, b.v)};
  im = {_mm512_permutex2var_ps(a.v, odd, b.v)};
}
static inline f16 order_lanes(f16 a) {
  return a;
}
static inline void join_in_lanes(f16 re, f16 im, f16 &a, f16 &b) {
  const __m512i low = _mm512_setr_epi32(0, 16, 1, 17, 2, 18, 3, 19, 4, 20, 5, 21, 6, 22, 7, 23);
  const __m512i high = _mm512_setr_epi32(8, 24, 9, 25, 10, 26, 11, 27, 12, 28, 13, 29, 14, 30, 15, 31);
  a = {_mm512_permutex2var_ps(re.v, low, im.v)};
  b = {_mm512_permutex2var_ps(re.v, high, im.v)};
}
static inline void load_complex(const float *p, f16 &re, f16 &im) {
  split_in_lanes(f16::load(p), f16::load(p + 16), re, im);
}
static inline void join(f16 re, f16 im, f16 &a, f16 &b) {
  join_in_lanes(re, im, a, b);
}

/// Rows of four floats by index, turned into four columns.
template <std::size_t stride>
static inline void load_columns(const float *rows, const int *index, f16 *columns) {
  const auto row = [=](int i) { return _mm_loadu_ps(rows + stride * static_cast<std::size_t>(index[i])); };
  const auto four_rows = [=](int i) {
    const __m512 two = _mm512_insertf32x4(_mm512_castps128_ps512(row(i)), row(i + 4), 1);
    return _mm512_insertf32x4(_mm512_insertf32x4(two, row(i + 8), 2), row(i + 12), 3);
  };
  const __m512 r0 = four_rows(0), r1 = four_rows(1), r2 = four_rows(2), r3 = four_rows(3);
  const __m512d a = _mm512_castps_pd(_mm512_unpacklo_ps(r0, r1)), b = _mm512_castps_pd(_mm512_unpacklo_ps(r2, r3));
  const __m512d c = _mm512_castps_pd(_mm512_unpackhi_ps(r0, r1)), d = _mm512_castps_pd(_mm512_unpackhi_ps(r2, r3));
  columns[0] = {_mm512_castpd_ps(_mm512_unpacklo_pd(a, b))};
  columns[1] = {_mm512_castpd_ps(_mm512_unpackhi_pd(a, b))};
  columns[2] = {_mm512_castpd_ps(_mm512_unpacklo_pd(c, d))};
  columns[3] = {_mm512_castpd_ps(_mm512_unpackhi_pd(c, d))};
}

/// Lanes 8 to 15 plus lanes 0 to 7.
static inline f8 add_halves(f16 a) {
  return {_mm256_add_ps(_mm512_extractf32x8_ps(a.v, 1), _mm512_castps512_ps256(a.v))};
}

static inline f16 reverse(f16 a) {
  const __m512i places = _mm512_setr_epi32(15, 14, 13, 12, 11, 10, 9, 8, 7, 6, 5, 4, 3, 2, 1, 0);
  return {_mm512_permutexvar_ps(places, a.v)};
}

// Eight complex values, real parts first.

static inline f16 reverse_pairs(f16 a) {
  const __m512i places = _mm512_setr_epi64(7, 6, 5, 4, 3, 2, 1, 0);
  return {_mm512_castpd_ps(_mm512_permutexvar_pd(places, _mm512_castps_pd(a.v)))};
}
static inline f16 conjugate(f16 a) {
  return {_mm512_castpd_ps(_mm512_xor_pd(_mm512_castps_pd(a.v), _mm512_set1_pd(-0.0)))};
}
static inline f16 even_twice(f16 a) {
  return {_mm512_moveldup_ps(a.v)};
}
static inline f16 odd_twice(f16 a) {
  return {_mm512_movehdup_ps(a.v)};
}
/// The same, but in a register: loads that cross lines of the caches cost more than a register, and GCC would load once
/// for each use.
static inline f16 in_register(f16 a) {
  asm("" : "+v"(a.v));
  return a;
}
static inline f16 subtract_and_add(f16 a, f16 b) {
  return {_mm512_add_ps(a.v, _mm512_xor_ps(b.v, f16::broadcast_pair(-0.F, 0.F).v))};
}

static inline f16 multiply_in_double(f16 a, double factor) {
  const __m512d factors = _mm512_set1_pd(factor);
  const __m512d low = _mm512_mul_pd(_mm512_cvtps_pd(_mm512_castps512_ps256(a.v)), factors);
  const __m512d high = _mm512_mul_pd(_mm512_cvtps_pd(_mm512_extractf32x8_ps(a.v, 1)), factors);
  return {_mm512_insertf32x8(_mm512_castps256_ps512(_mm512_cvtpd_ps(low)), _mm512_cvtpd_ps(high), 1)};
}

/// Eight doubles.
struct d8 {
  static constexpr std::size_t lanes = 8;
  __m512d v;
  /// Floats, widened.
  static inline d8 load(const float *p) { return {_mm512_cvtps_pd(_mm256_loadu_ps(p))}; }
  static inline d8 load(const double *p) { return {_mm512_loadu_pd(p)}; }
  static inline d8 broadcast(double a) { return {_mm512_set1_pd(a)}; }
  /// a b a b a b a b.
  static inline d8 broadcast_pair(const double *p) { return {_mm512_broadcast_f64x2(_mm_loadu_pd(p))}; }
};

using wide_double = d8;

static inline void store(double *p, d8 a) {
  _mm512_storeu_pd(p, a.v);
}
/// Eight complex values to real and imaginary parts in their order.
static inline void split_pairs(d8 a, d8 b, d8 &re, d8 &im) {
  re = {_mm512_permutex2var_pd(a.v, _mm512_setr_epi64(0, 2, 4, 6, 8, 10, 12, 14), b.v)};
  im = {_mm512_permutex2var_pd(a.v, _mm512_setr_epi64(1, 3, 5, 7, 9, 11, 13, 15), b.v)};
}

static constexpr bool loads_lines = true;

/// Two registers' worth of values, from the three lines of the caches that they lie in. `before` values of the first line
/// and all from there on in the third are not read.
template <class Lanes>
struct across_lines;

template <>
struct across_lines<f16> {
  std::size_t before;
  __m512i places;
  explicit across_lines(const float *p)
      : before(reinterpret_cast<std::size_t>(p) % 64 / sizeof(float)),
        places(_mm512_add_epi32(_mm512_setr_epi32(0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15),
                                _mm512_set1_epi32(static_cast<int>(before)))) {}
  inline void load(const float *p, f16 &a, f16 &b) const {
    const auto behind = static_cast<__mmask16>(0xFFFFU << before);
    const __m512 first = _mm512_maskz_load_ps(behind, p - before), second = _mm512_load_ps(p - before + 16);
    const __m512 third = _mm512_maskz_load_ps(_knot_mask16(behind), p - before + 32);
    a = {_mm512_permutex2var_ps(first, places, second)};
    b = {_mm512_permutex2var_ps(second, places, third)};
  }
};

template <>
struct across_lines<d8> {
  std::size_t before;
  __m512i places;
  explicit across_lines(const double *p)
      : before(reinterpret_cast<std::size_t>(p) % 64 / sizeof(double)),
        places(_mm512_add_epi64(_mm512_setr_epi64(0, 1, 2, 3, 4, 5, 6, 7),
                                _mm512_set1_epi64(static_cast<long long>(before)))) {}
  inline void load(const double *p, d8 &a, d8 &b) const {
    const auto behind = static_cast<__mmask8>(0xFFU << before);
    const __m512d first = _mm512_maskz_load_pd(behind, p - before), second = _mm512_load_pd(p - before + 8);
    const __m512d third = _mm512_maskz_load_pd(_knot_mask8(behind), p - before + 16);
    a = {_mm512_permutex2var_pd(first, places, second)};
    b = {_mm512_permutex2var_pd(second, places, third)};
  }
};

/// Takes split_pairs back.
static inline void join_pairs(d8 re, d8 im, d8 &a, d8 &b) {
  a = {_mm512_permutex2var_pd(re.v, _mm512_setr_epi64(0, 8, 1, 9, 2, 10, 3, 11), im.v)};
  b = {_mm512_permutex2var_pd(re.v, _mm512_setr_epi64(4, 12, 5, 13, 6, 14, 7, 15), im.v)};
}
/// Rounded to floats.
static inline void store(float *p, d8 a) {
  _mm256_storeu_ps(p, _mm512_cvtpd_ps(a.v));
}
static inline d8 reverse(d8 a) {
  return {_mm512_permutexvar_pd(_mm512_setr_epi64(7, 6, 5, 4, 3, 2, 1, 0), a.v)};
}
static inline d8 operator+(d8 a, d8 b) {
  return {_mm512_add_pd(a.v, b.v)};
}
static inline d8 operator-(d8 a, d8 b) {
  return {_mm512_sub_pd(a.v, b.v)};
}
static inline d8 operator*(d8 a, d8 b) {
  return {_mm512_mul_pd(a.v, b.v)};
}
static inline d8 swap_pairs(d8 a) {
  return {_mm512_permute_pd(a.v, 0x55)};
}
static inline d8 even_twice(d8 a) {
  return {_mm512_movedup_pd(a.v)};
}
static inline d8 odd_twice(d8 a) {
  return {_mm512_permute_pd(a.v, 0xff)};
}
static inline d8 in_register(d8 a) {
  asm("" : "+v"(a.v));
  return a;
}
static inline d8 subtract_and_add(d8 a, d8 b) {
  const __m512d signs = _mm512_setr_pd(-0.0, 0.0, -0.0, 0.0, -0.0, 0.0, -0.0, 0.0);
  return {_mm512_add_pd(a.v, _mm512_xor_pd(b.v, signs))};
}

/// Lane k, eight times.
template <int k>
static inline d8 broadcast_lane(d8 a) {
  return {_mm512_permutexvar_pd(_mm512_set1_epi64(k), a.v)};
}
/// True when all are smaller than `least`, which is below 2^-511; false with a NaN. Larger ones are told by two bits of
/// their exponents, which is faster.
static inline bool all_below(d8 a, d8 least) {
  if (_mm512_test_epi64_mask(_mm512_castpd_si512(a.v), _mm512_set1_epi64(0x6000000000000000)) != 0) return false;
  return _mm512_cmp_pd_mask(_mm512_abs_pd(a.v), least.v, _CMP_LT_OQ) == 0xff;
}
/// Lanes 2 k and 2 k + 1, four times.
template <int k>
static inline d8 broadcast_pair(d8 a) {
  return {_mm512_shuffle_f64x2(a.v, a.v, 0x55 * k)};
}
