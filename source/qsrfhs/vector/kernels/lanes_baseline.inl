// f8, eight floats, in two SSE2 registers. SPDX-License-Identifier: MIT

struct f8 {
  static constexpr std::size_t lanes = 8;
  __m128 low, high;
  static inline f8 load(const float *p) { return {_mm_loadu_ps(p), _mm_loadu_ps(p + 4)}; }
  static inline f8 broadcast(float a) { return {_mm_set1_ps(a), _mm_set1_ps(a)}; }
  /// Eight times the float with these bits.
  static inline f8 broadcast_bits(int bits) {
    const __m128 four = _mm_castsi128_ps(_mm_set1_epi32(bits));
    return {four, four};
  }
  /// a b a b a b a b.
  static inline f8 broadcast_pair(float a, float b) {
    const __m128 pairs = _mm_setr_ps(a, b, a, b);
    return {pairs, pairs};
  }
  /// Four floats, each twice: p0 p0 p1 p1 p2 p2 p3 p3.
  static inline f8 load_twice(const float *p) {
    const __m128 a = _mm_loadu_ps(p);
    return {_mm_unpacklo_ps(a, a), _mm_unpackhi_ps(a, a)};
  }
};

// Where the builds differ on purpose; what follows from it is told where it is used.
static constexpr std::size_t polynomial_coefficients = 16;
static constexpr std::size_t polynomial_boundary = 0;
static constexpr bool peak_sums_in_lanes = false;

/// Sums that a filter keeps in registers; results do not depend on it.
static constexpr std::size_t filter_sums = 4;

static inline void store(float *p, f8 a) {
  _mm_storeu_ps(p, a.low);
  _mm_storeu_ps(p + 4, a.high);
}
/// Stores past the caches; p lies on a boundary of 32 bytes.
static inline void stream(float *p, f8 a) {
  _mm_stream_ps(p, a.low);
  _mm_stream_ps(p + 4, a.high);
}

/// 1 0 3 2 5 4 7 6.
static inline f8 swap_pairs(f8 a) {
  return {_mm_shuffle_ps(a.low, a.low, 0xb1), _mm_shuffle_ps(a.high, a.high, 0xb1)};
}
static inline f8 operator+(f8 a, f8 b) {
  return {_mm_add_ps(a.low, b.low), _mm_add_ps(a.high, b.high)};
}
static inline f8 operator-(f8 a, f8 b) {
  return {_mm_sub_ps(a.low, b.low), _mm_sub_ps(a.high, b.high)};
}
static inline f8 operator*(f8 a, f8 b) {
  return {_mm_mul_ps(a.low, b.low), _mm_mul_ps(a.high, b.high)};
}
static inline f8 operator/(f8 a, f8 b) {
  return {_mm_div_ps(a.low, b.low), _mm_div_ps(a.high, b.high)};
}
static inline f8 square_root(f8 a) {
  return {_mm_sqrt_ps(a.low), _mm_sqrt_ps(a.high)};
}
/// a > b ? a : b, so b where one of them is a NaN.
static inline f8 greater_of(f8 a, f8 b) {
  return {_mm_max_ps(a.low, b.low), _mm_max_ps(a.high, b.high)};
}
/// a < b ? a : b.
static inline f8 smaller_of(f8 a, f8 b) {
  return {_mm_min_ps(a.low, b.low), _mm_min_ps(a.high, b.high)};
}

// Comparisons give lanes of all ones or all zeros; a NaN compares false.
static inline f8 operator>=(f8 a, f8 b) {
  return {_mm_cmpge_ps(a.low, b.low), _mm_cmpge_ps(a.high, b.high)};
}
static inline f8 operator==(f8 a, f8 b) {
  return {_mm_cmpeq_ps(a.low, b.low), _mm_cmpeq_ps(a.high, b.high)};
}
static inline f8 operator&(f8 a, f8 b) {
  return {_mm_and_ps(a.low, b.low), _mm_and_ps(a.high, b.high)};
}
static inline f8 operator|(f8 a, f8 b) {
  return {_mm_or_ps(a.low, b.low), _mm_or_ps(a.high, b.high)};
}
/// b without the bits of a.
static inline f8 clear(f8 a, f8 b) {
  return {_mm_andnot_ps(a.low, b.low), _mm_andnot_ps(a.high, b.high)};
}
static inline f8 select(f8 mask, f8 a, f8 b) {
  return (mask & a) | clear(mask, b);
}

/// Bits of the integers that the lanes give when cut towards zero; the most negative integer for a NaN and for what
/// does not fit.
static inline f8 to_integers(f8 a) {
  return {_mm_castsi128_ps(_mm_cvttps_epi32(a.low)), _mm_castsi128_ps(_mm_cvttps_epi32(a.high))};
}
/// Values of lanes that hold the bits of integers.
static inline f8 from_integers(f8 a) {
  return {_mm_cvtepi32_ps(_mm_castps_si128(a.low)), _mm_cvtepi32_ps(_mm_castps_si128(a.high))};
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

/// Lanes 0 1 4 5, each twice, and lanes 2 3 6 7.
static inline f8 twice_low(f8 a) {
  return {_mm_unpacklo_ps(a.low, a.low), _mm_unpacklo_ps(a.high, a.high)};
}
static inline f8 twice_high(f8 a) {
  return {_mm_unpackhi_ps(a.low, a.low), _mm_unpackhi_ps(a.high, a.high)};
}

/// Takes split_in_lanes back.
static inline void join_in_lanes(f8 re, f8 im, f8 &a, f8 &b) {
  a = {_mm_unpacklo_ps(re.low, im.low), _mm_unpackhi_ps(re.low, im.low)};
  b = {_mm_unpacklo_ps(re.high, im.high), _mm_unpackhi_ps(re.high, im.high)};
}

/// Eight complex values, to eight real and eight imaginary parts in their order.
static inline void load_complex(const float *p, f8 &re, f8 &im) {
  split_in_lanes(f8::load(p), f8::load(p + 8), re, im);
}

/// Takes the order of load_complex back.
static inline void join(f8 re, f8 im, f8 &a, f8 &b) {
  join_in_lanes(re, im, a, b);
}

/// Four rows of four floats by index, turned into columns.
template <std::size_t stride>
static inline void load_four_columns(const float *rows, const int *index, __m128 *columns) {
  const auto row = [=](int i) { return _mm_loadu_ps(rows + stride * static_cast<std::size_t>(index[i])); };
  const __m128 r0 = row(0), r1 = row(1), r2 = row(2), r3 = row(3);
  const __m128 a = _mm_unpacklo_ps(r0, r1), b = _mm_unpacklo_ps(r2, r3);
  const __m128 c = _mm_unpackhi_ps(r0, r1), d = _mm_unpackhi_ps(r2, r3);
  columns[0] = _mm_movelh_ps(a, b);
  columns[1] = _mm_movehl_ps(b, a);
  columns[2] = _mm_movelh_ps(c, d);
  columns[3] = _mm_movehl_ps(d, c);
}

/// Rows of four floats by index, turned into four columns.
template <std::size_t stride>
static inline void load_columns(const float *rows, const int *index, f8 *columns) {
  __m128 low[4], high[4];
  load_four_columns<stride>(rows, index, low);
  load_four_columns<stride>(rows, index + 4, high);
  for (int i = 0; i < 4; ++i) columns[i] = {low[i], high[i]};
}

/// p[index] and p[index + 1], by eight indices.
static inline void load_pairs(const float *p, const int *index, f8 &first, f8 &second) {
  const auto two = [=](int i) {
    const __m128 low = _mm_loadl_pi(_mm_setzero_ps(), reinterpret_cast<const __m64 *>(p + index[i]));
    return _mm_loadh_pi(low, reinterpret_cast<const __m64 *>(p + index[i + 1]));
  };
  const __m128 a = two(0), b = two(2), c = two(4), d = two(6);
  first = {_mm_shuffle_ps(a, b, 0x88), _mm_shuffle_ps(c, d, 0x88)};
  second = {_mm_shuffle_ps(a, b, 0xdd), _mm_shuffle_ps(c, d, 0xdd)};
}

/// The eight floats in reverse order.
static inline f8 reverse(f8 a) {
  return {_mm_shuffle_ps(a.high, a.high, 0x1b), _mm_shuffle_ps(a.low, a.low, 0x1b)};
}

// Four complex values, real parts first.

static inline f8 reverse_pairs(f8 a) {
  return {_mm_shuffle_ps(a.high, a.high, 0x4e), _mm_shuffle_ps(a.low, a.low, 0x4e)};
}
static inline f8 conjugate(f8 a) {
  const __m128 signs = _mm_setr_ps(0.F, -0.F, 0.F, -0.F);
  return {_mm_xor_ps(a.low, signs), _mm_xor_ps(a.high, signs)};
}
/// 0 0 2 2 4 4 6 6, and 1 1 3 3 5 5 7 7.
static inline f8 even_twice(f8 a) {
  return {_mm_shuffle_ps(a.low, a.low, 0xa0), _mm_shuffle_ps(a.high, a.high, 0xa0)};
}
static inline f8 odd_twice(f8 a) {
  return {_mm_shuffle_ps(a.low, a.low, 0xf5), _mm_shuffle_ps(a.high, a.high, 0xf5)};
}

static inline __m128 multiply_four_in_double(__m128 a, __m128d factors) {
  const __m128 low = _mm_cvtpd_ps(_mm_mul_pd(_mm_cvtps_pd(a), factors));
  return _mm_movelh_ps(low, _mm_cvtpd_ps(_mm_mul_pd(_mm_cvtps_pd(_mm_movehl_ps(a, a)), factors)));
}
/// Each float times `factor`, rounded once more than the product in double is.
static inline f8 multiply_in_double(f8 a, double factor) {
  const __m128d factors = _mm_set1_pd(factor);
  return {multiply_four_in_double(a.low, factors), multiply_four_in_double(a.high, factors)};
}

/// Sums of the even and of the odd lanes.
static inline void sum_pairs(f8 a, float *sums) {
  const __m128 four = _mm_add_ps(a.low, a.high);
  _mm_storel_pi(reinterpret_cast<__m64 *>(sums), _mm_add_ps(four, _mm_movehl_ps(four, four)));
}

/// The same, but in a register: loads that cross lines of the caches cost more than a register, and GCC would load once
/// for each use.
static inline f8 in_register(f8 a) {
  asm("" : "+x"(a.low), "+x"(a.high));
  return a;
}
/// a - b in even lanes, a + b in odd ones.
static inline f8 subtract_and_add(f8 a, f8 b) {
  const __m128 signs = _mm_setr_ps(-0.F, 0.F, -0.F, 0.F);
  return {_mm_add_ps(a.low, _mm_xor_ps(b.low, signs)), _mm_add_ps(a.high, _mm_xor_ps(b.high, signs))};
}

/// Four doubles.
struct d4 {
  static constexpr std::size_t lanes = 4;
  __m128d low, high;
  /// Floats, widened.
  static inline d4 load(const float *p) {
    const __m128 four = _mm_loadu_ps(p);
    return {_mm_cvtps_pd(four), _mm_cvtps_pd(_mm_movehl_ps(four, four))};
  }
  static inline d4 load(const double *p) { return {_mm_loadu_pd(p), _mm_loadu_pd(p + 2)}; }
  static inline d4 broadcast(double a) { return {_mm_set1_pd(a), _mm_set1_pd(a)}; }
  /// a b a b.
  static inline d4 broadcast_pair(const double *p) { return {_mm_loadu_pd(p), _mm_loadu_pd(p)}; }
};

static inline void store(double *p, d4 a) {
  _mm_storeu_pd(p, a.low);
  _mm_storeu_pd(p + 2, a.high);
}
static inline d4 reverse(d4 a) {
  return {_mm_shuffle_pd(a.high, a.high, 1), _mm_shuffle_pd(a.low, a.low, 1)};
}
static inline d4 operator+(d4 a, d4 b) {
  return {_mm_add_pd(a.low, b.low), _mm_add_pd(a.high, b.high)};
}
static inline d4 operator-(d4 a, d4 b) {
  return {_mm_sub_pd(a.low, b.low), _mm_sub_pd(a.high, b.high)};
}
static inline d4 operator*(d4 a, d4 b) {
  return {_mm_mul_pd(a.low, b.low), _mm_mul_pd(a.high, b.high)};
}
static inline d4 swap_pairs(d4 a) {
  return {_mm_shuffle_pd(a.low, a.low, 1), _mm_shuffle_pd(a.high, a.high, 1)};
}
static inline d4 in_register(d4 a) {
  asm("" : "+x"(a.low), "+x"(a.high));
  return a;
}
static inline d4 subtract_and_add(d4 a, d4 b) {
  const __m128d signs = _mm_setr_pd(-0.0, 0.0);
  return {_mm_add_pd(a.low, _mm_xor_pd(b.low, signs)), _mm_add_pd(a.high, _mm_xor_pd(b.high, signs))};
}
static inline d4 even_twice(d4 a) {
  return {_mm_unpacklo_pd(a.low, a.low), _mm_unpacklo_pd(a.high, a.high)};
}
static inline d4 odd_twice(d4 a) {
  return {_mm_unpackhi_pd(a.low, a.low), _mm_unpackhi_pd(a.high, a.high)};
}

/// Four complex values to real and imaginary parts in their order.
static inline void split_pairs(d4 a, d4 b, d4 &re, d4 &im) {
  re = {_mm_unpacklo_pd(a.low, a.high), _mm_unpacklo_pd(b.low, b.high)};
  im = {_mm_unpackhi_pd(a.low, a.high), _mm_unpackhi_pd(b.low, b.high)};
}
/// Takes split_pairs back.
static inline void join_pairs(d4 re, d4 im, d4 &a, d4 &b) {
  a = {_mm_unpacklo_pd(re.low, im.low), _mm_unpackhi_pd(re.low, im.low)};
  b = {_mm_unpacklo_pd(re.high, im.high), _mm_unpackhi_pd(re.high, im.high)};
}
/// Rounded to floats.
static inline void store(float *p, d4 a) {
  _mm_storeu_ps(p, _mm_movelh_ps(_mm_cvtpd_ps(a.low), _mm_cvtpd_ps(a.high)));
}

/// True when all are smaller than `least`; false with a NaN.
static inline bool all_below(d4 a, d4 least) {
  const __m128d sign = _mm_set1_pd(-0.0);
  const __m128d low = _mm_cmplt_pd(_mm_andnot_pd(sign, a.low), least.low);
  const __m128d high = _mm_cmplt_pd(_mm_andnot_pd(sign, a.high), least.high);
  return _mm_movemask_pd(_mm_and_pd(low, high)) == 3;
}

/// Lane k, four times.
template <int k>
static inline d4 broadcast_lane(d4 a) {
  const __m128d half = k < 2 ? a.low : a.high;
  const __m128d both = k % 2 != 0 ? _mm_unpackhi_pd(half, half) : _mm_unpacklo_pd(half, half);
  return {both, both};
}
/// Lanes 2 k and 2 k + 1, twice.
template <int k>
static inline d4 broadcast_pair(d4 a) {
  return k == 0 ? d4{a.low, a.low} : d4{a.high, a.high};
}
