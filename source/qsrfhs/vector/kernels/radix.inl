// The first pass of a long transform, of radix 16 with decimation in frequency, that takes the window along. Each line
// of the samples, of the window and of the results is gone over at once: the rows lie in the same few lines of the
// first-level cache. SPDX-License-Identifier: MIT

/// Complex values, real parts apart from imaginary ones.
template <class Lanes>
struct planes_of {
  Lanes re, im;
};

template <class Lanes>
static inline planes_of<Lanes> operator+(planes_of<Lanes> a, planes_of<Lanes> b) {
  return {a.re + b.re, a.im + b.im};
}
template <class Lanes>
static inline planes_of<Lanes> operator-(planes_of<Lanes> a, planes_of<Lanes> b) {
  return {a.re - b.re, a.im - b.im};
}
template <class Lanes>
static inline planes_of<Lanes> operator*(planes_of<Lanes> a, planes_of<Lanes> b) {
  return {multiply_subtract(a.re, b.re, a.im * b.im), multiply_add(a.re, b.im, a.im * b.re)};
}
/// a + j b.
template <class Lanes>
static inline planes_of<Lanes> add_turned(planes_of<Lanes> a, planes_of<Lanes> b) {
  return {a.re - b.im, a.im + b.re};
}
/// a - j b.
template <class Lanes>
static inline planes_of<Lanes> subtract_turned(planes_of<Lanes> a, planes_of<Lanes> b) {
  return {a.re + b.im, a.im - b.re};
}

static inline planes_of<wide> load_planes(const float *p) {
  planes_of<wide> a;
  load_complex(p, a.re, a.im);
  return a;
}
static inline planes_of<wide_double> load_planes(const double *p) {
  planes_of<wide_double> a;
  split_pairs(wide_double::load(p), wide_double::load(p + wide_double::lanes), a.re, a.im);
  return a;
}
static inline void store_planes(float *p, planes_of<wide> a) {
  store_complex<into_caches>(p, a.re, a.im);
}
static inline void store_planes(double *p, planes_of<wide_double> a) {
  wide_double first, second;
  join_pairs(a.re, a.im, first, second);
  store(p, first);
  store(p + wide_double::lanes, second);
}

/// Four points, from a + c, a - c, b + d and b - d.
template <class Lanes>
static inline void four_points(planes_of<Lanes> ac, planes_of<Lanes> a_c, planes_of<Lanes> bd, planes_of<Lanes> b_d,
                               planes_of<Lanes> *out) {
  out[0] = ac + bd;
  out[1] = subtract_turned(a_c, b_d);
  out[2] = ac - bd;
  out[3] = add_turned(a_c, b_d);
}

/// exp(-2 pi j p b / 16) a; but for p = b = 2, whose quarter of a turn is left to what takes it.
template <int p, int b, class Real, class Lanes>
static inline planes_of<Lanes> turn(planes_of<Lanes> a) {
  constexpr double diagonal = 0.70710678118654752, cosine = 0.92387953251128676, sine = 0.38268343236508977;
  const auto lanes = [](double value) { return Lanes::broadcast(static_cast<Real>(value)); };
  const auto times = [&](double re, double im) { return a * planes_of<Lanes>{lanes(re), lanes(im)}; };
  if constexpr (p * b == 1) return times(cosine, -sine);
  if constexpr (p * b == 2) return {(a.re + a.im) * lanes(diagonal), (a.im - a.re) * lanes(diagonal)};
  if constexpr (p * b == 3) return times(sine, -cosine);
  if constexpr (p * b == 6) return {(a.im - a.re) * lanes(diagonal), (a.re + a.im) * lanes(-diagonal)};
  if constexpr (p * b == 9) return times(-cosine, sine);
  return a;
}

/// Points b, b + 4, b + 8 and b + 12 of the radix, to point b of each of four transforms p.
template <int b, class Lanes, class Real>
static inline void first_four(const Real *x, std::size_t row, const Real *w, planes_of<Lanes> (*between)[4]) {
  const auto weighted = [&](std::size_t r) {
    const planes_of<Lanes> a = load_planes(x + 2 * r * row);
    const Lanes weight = Lanes::load(w + r * radix_group);
    return planes_of<Lanes>{a.re * weight, a.im * weight};
  };
  const auto x0 = weighted(b), x1 = weighted(b + 4), x2 = weighted(b + 8), x3 = weighted(b + 12);
  planes_of<Lanes> out[4];
  four_points(x0 + x2, x0 - x2, x1 + x3, x1 - x3, out);
  between[0][b] = out[0];
  between[1][b] = turn<1, b, Real>(out[1]);
  between[2][b] = turn<2, b, Real>(out[2]);
  between[3][b] = turn<3, b, Real>(out[3]);
}

/// Points p, p + 4, p + 8 and p + 12 of the results, times their twiddle factors.
template <int p, class Lanes, class Real>
static inline void second_four(const planes_of<Lanes> *x, const Real *columns, const Real *block, Real *out,
                               std::size_t stride) {
  planes_of<Lanes> y[4];
  if constexpr (p == 2)
    four_points(subtract_turned(x[0], x[2]), add_turned(x[0], x[2]), x[1] + x[3], x[1] - x[3], y);
  else
    four_points(x[0] + x[2], x[0] - x[2], x[1] + x[3], x[1] - x[3], y);
  for (std::size_t q = 0; q < 4; ++q) {
    const std::size_t k = p + 4 * q;
    if (k != 0) {
      const Real *const column = columns + 2 * k * radix_group;
      const planes_of<Lanes> near{Lanes::load(column), Lanes::load(column + radix_group)};
      const planes_of<Lanes> far{Lanes::broadcast(block[2 * k]), Lanes::broadcast(block[2 * k + 1])};
      y[q] = y[q] * (near * far);
    }
    store_planes(out + 2 * k * stride, y[q]);
  }
}

template <class Lanes, class Real>
static inline void windowed_radix(const Real *x, const radix_plan<Real> &plan, Real *out) {
  for (std::size_t n = 0; n < plan.row; n += Lanes::lanes) {
    const std::size_t in_group = n % radix_group, group = n - in_group;
    const Real *const w = plan.window + group * radix + in_group;
    planes_of<Lanes> between[4][4];
    first_four<0>(x + 2 * n, plan.row, w, between);
    first_four<1>(x + 2 * n, plan.row, w, between);
    first_four<2>(x + 2 * n, plan.row, w, between);
    first_four<3>(x + 2 * n, plan.row, w, between);
    const Real *const columns = plan.columns + in_group, *const block = plan.blocks + 2 * group;
    second_four<0>(between[0], columns, block, out + 2 * n, plan.stride);
    second_four<1>(between[1], columns, block, out + 2 * n, plan.stride);
    second_four<2>(between[2], columns, block, out + 2 * n, plan.stride);
    second_four<3>(between[3], columns, block, out + 2 * n, plan.stride);
  }
}

static void windowed_radix_16(const float *x, const radix_plan<float> &plan, float *out) {
  windowed_radix<wide>(x, plan, out);
}
static void windowed_radix_16_double(const double *x, const radix_plan<double> &plan, double *out) {
  windowed_radix<wide_double>(x, plan, out);
}
