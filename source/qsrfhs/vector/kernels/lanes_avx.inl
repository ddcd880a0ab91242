// f8, eight floats, in one AVX register. Only what AVX itself has: no AVX2, no FMA. SPDX-License-Identifier: MIT

struct f8 {
  static constexpr std::size_t lanes = 8;
  __m256 v;
  static inline f8 load(const float *p) { return {_mm256_loadu_ps(p)}; }
  static inline f8 broadcast(float a) { return {_mm256_set1_ps(a)}; }
  /// Eight times the float with these bits.
  static inline f8 broadcast_bits(int bits) { return {_mm256_castsi256_ps(_mm256_set1_epi32(bits))}; }
  /// a b a b a b a b.
  static inline f8 broadcast_pair(float a, float b) { return {_mm256_setr_ps(a, b, a, b, a, b, a, b)}; }
  /// Four floats, each twice: p0 p0 p1 p1 p2 p2 p3 p3.
  static inline f8 load_twice(const float *p) {
    const __m256 both = _mm256_broadcast_ps(reinterpret_cast<const __m128 *>(p));
    return {_mm256_permutevar_ps(both, _mm256_setr_epi32(0, 0, 1, 1, 2, 2, 3, 3))};
  }
};

// Where the builds differ on purpose; what follows from it is told where it is used.
static constexpr std::size_t polynomial_coefficients = 32;
static constexpr std::size_t polynomial_boundary = 32;
static constexpr bool peak_sums_in_lanes = true;

/// Sums that a filter keeps in registers; results do not depend on it.
static constexpr std::size_t filter_sums = 8;

static inline void store(float *p, f8 a) {
  _mm256_storeu_ps(p, a.v);
}
/// Stores past the caches; p lies on a boundary of 32 bytes.
static inline void stream(float *p, f8 a) {
  _mm256_stream_ps(p, a.v);
}

/// 1 0 3 2 5 4 7 6.
static inline f8 swap_pairs(f8 a) {
  return {_mm256_permute_ps(a.v, 0xb1)};
}
static inline f8 operator+(f8 a, f8 b) {
  return {_mm256_add_ps(a.v, b.v)};
}
static inline f8 operator-(f8 a, f8 b) {
  return {_mm256_sub_ps(a.v, b.v)};
}
static inline f8 operator*(f8 a, f8 b) {
  return {_mm256_mul_ps(a.v, b.v)};
}
static inline f8 operator/(f8 a, f8 b) {
  return {_mm256_div_ps(a.v, b.v)};
}
static inline f8 square_root(f8 a) {
  return {_mm256_sqrt_ps(a.v)};
}
/// a > b ? a : b, so b where one of them is a NaN.
static inline f8 greater_of(f8 a, f8 b) {
  return {_mm256_max_ps(a.v, b.v)};
}
/// a < b ? a : b.
static inline f8 smaller_of(f8 a, f8 b) {
  return {_mm256_min_ps(a.v, b.v)};
}

// Comparisons give lanes of all ones or all zeros; a NaN compares false.
static inline f8 operator>=(f8 a, f8 b) {
  return {_mm256_cmp_ps(a.v, b.v, _CMP_GE_OS)};
}
static inline f8 operator==(f8 a, f8 b) {
  return {_mm256_cmp_ps(a.v, b.v, _CMP_EQ_OQ)};
}
static inline f8 operator&(f8 a, f8 b) {
  return {_mm256_and_ps(a.v, b.v)};
}
static inline f8 operator|(f8 a, f8 b) {
  return {_mm256_or_ps(a.v, b.v)};
}
/// b without the bits of a.
static inline f8 clear(f8 a, f8 b) {
  return {_mm256_andnot_ps(a.v, b.v)};
}
/// Not by the blend instruction: GCC 12 takes it apart into scalar code where there is no AVX2.
static inline f8 select(f8 mask, f8 a, f8 b) {
  return (mask & a) | clear(mask, b);
}

/// Bits of the integers that the lanes give when cut towards zero; the most negative integer for a NaN and for what
/// does not fit.
static inline f8 to_integers(f8 a) {
  return {_mm256_castsi256_ps(_mm256_cvttps_epi32(a.v))};
}
/// Values of lanes that hold the bits of integers.
static inline f8 from_integers(f8 a) {
  return {_mm256_cvtepi32_ps(_mm256_castps_si256(a.v))};
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

/// Lanes 0 1 4 5, each twice, and lanes 2 3 6 7.
static inline f8 twice_low(f8 a) {
  return {_mm256_unpacklo_ps(a.v, a.v)};
}
static inline f8 twice_high(f8 a) {
  return {_mm256_unpackhi_ps(a.v, a.v)};
}

/// Takes split_in_lanes back.
static inline void join_in_lanes(f8 re, f8 im, f8 &a, f8 &b) {
  a = {_mm256_unpacklo_ps(re.v, im.v)};
  b = {_mm256_unpackhi_ps(re.v, im.v)};
}

static inline __m256 load_halves(const float *low, const float *high) {
  return _mm256_insertf128_ps(_mm256_castps128_ps256(_mm_loadu_ps(low)), _mm_loadu_ps(high), 1);
}

/// Eight complex values, to eight real and eight imaginary parts in their order.
static inline void load_complex(const float *p, f8 &re, f8 &im) {
  const __m256 low = load_halves(p, p + 8), high = load_halves(p + 4, p + 12);
  re = {_mm256_shuffle_ps(low, high, 0x88)};
  im = {_mm256_shuffle_ps(low, high, 0xdd)};
}

/// Takes the order of load_complex back.
static inline void join(f8 re, f8 im, f8 &a, f8 &b) {
  const __m256 low = _mm256_unpacklo_ps(re.v, im.v), high = _mm256_unpackhi_ps(re.v, im.v);
  a = {_mm256_permute2f128_ps(low, high, 0x20)};
  b = {_mm256_permute2f128_ps(low, high, 0x31)};
}

/// Rows of four floats by index, turned into four columns.
template <std::size_t stride>
static inline void load_columns(const float *rows, const int *index, f8 *columns) {
  const auto row = [=](int i) { return rows + stride * static_cast<std::size_t>(index[i]); };
  const __m256 r0 = load_halves(row(0), row(4)), r1 = load_halves(row(1), row(5));
  const __m256 r2 = load_halves(row(2), row(6)), r3 = load_halves(row(3), row(7));
  const __m256d a = _mm256_castps_pd(_mm256_unpacklo_ps(r0, r1)), b = _mm256_castps_pd(_mm256_unpacklo_ps(r2, r3));
  const __m256d c = _mm256_castps_pd(_mm256_unpackhi_ps(r0, r1)), d = _mm256_castps_pd(_mm256_unpackhi_ps(r2, r3));
  columns[0] = {_mm256_castpd_ps(_mm256_unpacklo_pd(a, b))};
  columns[1] = {_mm256_castpd_ps(_mm256_unpackhi_pd(a, b))};
  columns[2] = {_mm256_castpd_ps(_mm256_unpacklo_pd(c, d))};
  columns[3] = {_mm256_castpd_ps(_mm256_unpackhi_pd(c, d))};
}

/// p[index] and p[index + 1], by eight indices.
static inline void load_pairs(const float *p, const int *index, f8 &first, f8 &second) {
  const auto two = [=](int i, int j) {
    const __m128 low = _mm_loadl_pi(_mm_setzero_ps(), reinterpret_cast<const __m64 *>(p + index[i]));
    return _mm_loadh_pi(low, reinterpret_cast<const __m64 *>(p + index[j]));
  };
  const __m256 low = _mm256_insertf128_ps(_mm256_castps128_ps256(two(0, 1)), two(4, 5), 1);
  const __m256 high = _mm256_insertf128_ps(_mm256_castps128_ps256(two(2, 3)), two(6, 7), 1);
  first = {_mm256_shuffle_ps(low, high, 0x88)};
  second = {_mm256_shuffle_ps(low, high, 0xdd)};
}

/// The eight floats in reverse order.
static inline f8 reverse(f8 a) {
  return {_mm256_permute_ps(_mm256_permute2f128_ps(a.v, a.v, 0x01), 0x1b)};
}

// Four complex values, real parts first.

static inline f8 reverse_pairs(f8 a) {
  return {_mm256_permute_ps(_mm256_permute2f128_ps(a.v, a.v, 0x01), 0x4e)};
}
static inline f8 conjugate(f8 a) {
  return {_mm256_xor_ps(a.v, _mm256_setr_ps(0.F, -0.F, 0.F, -0.F, 0.F, -0.F, 0.F, -0.F))};
}
/// 0 0 2 2 4 4 6 6, and 1 1 3 3 5 5 7 7.
static inline f8 even_twice(f8 a) {
  return {_mm256_moveldup_ps(a.v)};
}
static inline f8 odd_twice(f8 a) {
  return {_mm256_movehdup_ps(a.v)};
}

/// Each float times `factor`, rounded once more than the product in double is.
static inline f8 multiply_in_double(f8 a, double factor) {
  const __m256d factors = _mm256_set1_pd(factor);
  const __m256d low = _mm256_mul_pd(_mm256_cvtps_pd(_mm256_castps256_ps128(a.v)), factors);
  const __m256d high = _mm256_mul_pd(_mm256_cvtps_pd(_mm256_extractf128_ps(a.v, 1)), factors);
  return {_mm256_insertf128_ps(_mm256_castps128_ps256(_mm256_cvtpd_ps(low)), _mm256_cvtpd_ps(high), 1)};
}

/// Sums of the even and of the odd lanes.
static inline void sum_pairs(f8 a, float *sums) {
  const __m128 four = _mm_add_ps(_mm256_castps256_ps128(a.v), _mm256_extractf128_ps(a.v, 1));
  _mm_storel_pi(reinterpret_cast<__m64 *>(sums), _mm_add_ps(four, _mm_movehl_ps(four, four)));
}

/// The same, but in a register: loads that cross lines of the caches cost more than a register, and GCC would load once
/// for each use.
static inline f8 in_register(f8 a) {
  asm("" : "+x"(a.v));
  return a;
}
/// a - b in even lanes, a + b in odd ones.
static inline f8 subtract_and_add(f8 a, f8 b) {
  return {_mm256_addsub_ps(a.v, b.v)};
}

/// Four doubles.
struct d4 {
  static constexpr std::size_t lanes = 4;
  __m256d v;
  /// Floats, widened.
  static inline d4 load(const float *p) { return {_mm256_cvtps_pd(_mm_loadu_ps(p))}; }
  static inline d4 load(const double *p) { return {_mm256_loadu_pd(p)}; }
  static inline d4 broadcast(double a) { return {_mm256_set1_pd(a)}; }
  /// a b a b.
  static inline d4 broadcast_pair(const double *p) {
    return {_mm256_broadcast_pd(reinterpret_cast<const __m128d *>(p))};
  }
};

static inline void store(double *p, d4 a) {
  _mm256_storeu_pd(p, a.v);
}
static inline d4 reverse(d4 a) {
  return {_mm256_permute_pd(_mm256_permute2f128_pd(a.v, a.v, 0x01), 0x5)};
}
static inline d4 operator+(d4 a, d4 b) {
  return {_mm256_add_pd(a.v, b.v)};
}
static inline d4 operator-(d4 a, d4 b) {
  return {_mm256_sub_pd(a.v, b.v)};
}
static inline d4 operator*(d4 a, d4 b) {
  return {_mm256_mul_pd(a.v, b.v)};
}
static inline d4 swap_pairs(d4 a) {
  return {_mm256_permute_pd(a.v, 0x5)};
}
static inline d4 in_register(d4 a) {
  asm("" : "+x"(a.v));
  return a;
}
static inline d4 subtract_and_add(d4 a, d4 b) {
  return {_mm256_addsub_pd(a.v, b.v)};
}
static inline d4 even_twice(d4 a) {
  return {_mm256_movedup_pd(a.v)};
}
static inline d4 odd_twice(d4 a) {
  return {_mm256_permute_pd(a.v, 0xf)};
}

/// Four complex values to real and imaginary parts in their order.
static inline void split_pairs(d4 a, d4 b, d4 &re, d4 &im) {
  const __m256d low = _mm256_permute2f128_pd(a.v, b.v, 0x20), high = _mm256_permute2f128_pd(a.v, b.v, 0x31);
  re = {_mm256_unpacklo_pd(low, high)};
  im = {_mm256_unpackhi_pd(low, high)};
}
/// Takes split_pairs back.
static inline void join_pairs(d4 re, d4 im, d4 &a, d4 &b) {
  const __m256d low = _mm256_unpacklo_pd(re.v, im.v), high = _mm256_unpackhi_pd(re.v, im.v);
  a = {_mm256_permute2f128_pd(low, high, 0x20)};
  b = {_mm256_permute2f128_pd(low, high, 0x31)};
}
/// Rounded to floats.
static inline void store(float *p, d4 a) {
  _mm_storeu_ps(p, _mm256_cvtpd_ps(a.v));
}

/// True when all are smaller than `least`; false with a NaN.
static inline bool all_below(d4 a, d4 least) {
  const __m256d size = _mm256_andnot_pd(_mm256_set1_pd(-0.0), a.v);
  return _mm256_movemask_pd(_mm256_cmp_pd(size, least.v, _CMP_LT_OQ)) == 0xf;
}

/// Lane k, four times.
template <int k>
static inline d4 broadcast_lane(d4 a) {
  return {_mm256_permute_pd(_mm256_permute2f128_pd(a.v, a.v, k < 2 ? 0x00 : 0x11), k % 2 != 0 ? 0xf : 0x0)};
}
/// Lanes 2 k and 2 k + 1, twice.
template <int k>
static inline d4 broadcast_pair(d4 a) {
  return {_mm256_permute2f128_pd(a.v, a.v, k == 0 ? 0x00 : 0x11)};
}
