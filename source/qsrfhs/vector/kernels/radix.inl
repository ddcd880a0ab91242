// The first pass of a long transform, of radix 16 with decimation in frequency, that may take a window along. Each line
// of the samples, of the window and of the results is gone over at once: the rows lie in the same few lines of the
// first-level cache. And what puts the bins of the rows back into their order. SPDX-License-Identifier: MIT

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

/// Samples of a row, two registers at once, wherever they lie.
template <class Lanes>
struct as_they_lie {
  template <class Real>
  inline planes_of<Lanes> operator()(const Real *p) const {
    return load_planes(p);
  }
};

/// Those that do not begin on a line of the caches, where rows lie in the same few lines of the first-level cache: a line
/// that two groups of columns share is gone before the second one comes, and split loads wait for both of theirs.
template <class Lanes>
struct line_by_line {
  across_lines<Lanes> lines;
  inline planes_of<Lanes> operator()(const float *p) const {
    planes_of<Lanes> values;
    Lanes a, b;
    lines.load(p, a, b);
    split_in_lanes(a, b, values.re, values.im);
    return values;
  }
  inline planes_of<Lanes> operator()(const double *p) const {
    planes_of<Lanes> values;
    Lanes a, b;
    lines.load(p, a, b);
    split_pairs(a, b, values.re, values.im);
    return values;
  }
};

/// A transform of four points, from sums and differences of points 0 and 2, and of points 1 and 3.
template <class Lanes>
static inline void four_points(planes_of<Lanes> sum_02, planes_of<Lanes> difference_02, planes_of<Lanes> sum_13,
                               planes_of<Lanes> difference_13, planes_of<Lanes> *out) {
  out[0] = sum_02 + sum_13;
  out[1] = subtract_turned(difference_02, difference_13);
  out[2] = sum_02 - sum_13;
  out[3] = add_turned(difference_02, difference_13);
}

/// exp(-2 pi j p b / 16) a. For p = b = 2 it is a: second_four turns that by its quarter when it adds it.
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

/// The window's values for row 0 from column n on.
template <class Real>
static inline const Real *window_of(const radix_plan<Real> &plan, std::size_t n) {
  const std::size_t in_group = n % radix_group;
  return plan.window + (n - in_group) * radix + in_group;
}

/// Points b, b + 4, b + 8 and b + 12 of the radix, to point b of each of four transforms p.
template <bool windowed, int b, class Lanes, class Load, class Real>
static inline void first_four(const Load &load, const Real *x, std::size_t row, const Real *w,
                              planes_of<Lanes> (*between)[4]) {
  const auto weighted = [&](std::size_t r) {
    const planes_of<Lanes> a = load(x + 2 * r * row);
    if constexpr (!windowed) return a;
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

/// Where the results of some columns go, and their twiddle factors.
template <class Real>
struct radix_columns {
  const Real *near, *far;
  Real *out;
  std::size_t stride;

  radix_columns(const radix_plan<Real> &plan, std::size_t n, Real *all)
      : near(plan.near + n % radix_group),
        far(plan.far + 2 * (n - n % radix_group)),
        out(all + 2 * n),
        stride(plan.stride) {}

  /// Point k of the results, times its factors.
  template <class Lanes>
  inline void put(std::size_t k, planes_of<Lanes> a) const {
    const Real *const column = near + 2 * k * radix_group;
    const planes_of<Lanes> first{Lanes::load(column), Lanes::load(column + radix_group)};
    const planes_of<Lanes> rest{Lanes::broadcast(far[2 * k]), Lanes::broadcast(far[2 * k + 1])};
    store_planes(out + 2 * k * stride, a * (first * rest));
  }
};

/// Points p, p + 4, p + 8 and p + 12 of the results.
template <int p, class Lanes, class Real>
static inline void second_four(const planes_of<Lanes> *x, const radix_columns<Real> &columns) {
  planes_of<Lanes> y[4];
  if constexpr (p == 2)
    four_points(subtract_turned(x[0], x[2]), add_turned(x[0], x[2]), x[1] + x[3], x[1] - x[3], y);
  else
    four_points(x[0] + x[2], x[0] - x[2], x[1] + x[3], x[1] - x[3], y);
  if constexpr (p == 0)
    store_planes(columns.out, y[0]);
  else
    columns.put(p, y[0]);
  for (std::size_t q = 1; q < 4; ++q) columns.put(p + 4 * q, y[q]);
}

template <bool windowed, class Lanes, class Load, class Real>
static inline void complex_radix_by(const Load load, const Real *x, const radix_plan<Real> &plan, Real *out) {
  for (std::size_t n = 0; n < plan.row; n += Lanes::lanes) {
    const Real *const w = windowed ? window_of(plan, n) : nullptr;
    planes_of<Lanes> between[4][4];
    first_four<windowed, 0>(load, x + 2 * n, plan.row, w, between);
    first_four<windowed, 1>(load, x + 2 * n, plan.row, w, between);
    first_four<windowed, 2>(load, x + 2 * n, plan.row, w, between);
    first_four<windowed, 3>(load, x + 2 * n, plan.row, w, between);
    const radix_columns<Real> columns(plan, n, out);
    second_four<0>(between[0], columns);
    second_four<1>(between[1], columns);
    second_four<2>(between[2], columns);
    second_four<3>(between[3], columns);
  }
}

template <bool windowed, class Lanes, class Real>
static inline void complex_radix(const Real *x, const radix_plan<Real> &plan, Real *out) {
  constexpr std::size_t line = 64, way = 4096;  // bytes
  if constexpr (loads_lines)
    if (reinterpret_cast<std::size_t>(x) % line != 0 && 2 * plan.row * sizeof(Real) % way == 0)
      return complex_radix_by<windowed, Lanes>(line_by_line<Lanes>{across_lines<Lanes>(x)}, x, plan, out);
  complex_radix_by<windowed, Lanes>(as_they_lie<Lanes>{}, x, plan, out);
}

/// The same of real samples: p = 3 has the conjugates of what p = 1 has.
template <class Lanes>
struct real_fours {
  Lanes even[4], odd[4];  // p = 0 and 2
  planes_of<Lanes> turned[4];
};

template <int b, class Lanes, class Real>
static inline void first_real_four(const Real *x, std::size_t row, const Real *w, real_fours<Lanes> &between) {
  const auto weighted = [&](std::size_t r) { return Lanes::load(x + r * row) * Lanes::load(w + r * radix_group); };
  const Lanes x0 = weighted(b), x1 = weighted(b + 4), x2 = weighted(b + 8), x3 = weighted(b + 12);
  const Lanes x02 = x0 + x2, x13 = x1 + x3;
  between.even[b] = x02 + x13;
  between.odd[b] = x02 - x13;
  between.turned[b] = turn<1, b, Real>(planes_of<Lanes>{x0 - x2, x3 - x1});
}

template <class Lanes, class Real>
static inline void second_real_fours(const real_fours<Lanes> &x, const radix_columns<Real> &columns) {
  const Lanes none = Lanes::broadcast(0);
  const Lanes e02 = x.even[0] + x.even[2], e13 = x.even[1] + x.even[3];
  store_planes(columns.out, planes_of<Lanes>{e02 + e13, none});
  columns.put(4, planes_of<Lanes>{x.even[0] - x.even[2], x.even[3] - x.even[1]});
  columns.put(8, planes_of<Lanes>{e02 - e13, none});

  const Lanes diagonal = Lanes::broadcast(static_cast<Real>(0.70710678118654752));
  const Lanes re = (x.odd[1] - x.odd[3]) * diagonal, im = (x.odd[1] + x.odd[3]) * diagonal;
  columns.put(2, planes_of<Lanes>{x.odd[0] + re, none - (x.odd[2] + im)});
  columns.put(6, planes_of<Lanes>{x.odd[0] - re, x.odd[2] - im});

  planes_of<Lanes> y[4];
  const planes_of<Lanes> *const t = x.turned;
  four_points(t[0] + t[2], t[0] - t[2], t[1] + t[3], t[1] - t[3], y);
  columns.put(1, y[0]);
  columns.put(5, y[1]);
  columns.put(7, planes_of<Lanes>{y[2].re, none - y[2].im});
  columns.put(3, planes_of<Lanes>{y[3].re, none - y[3].im});
}

template <class Lanes, class Real>
static inline void windowed_real_radix(const Real *x, const radix_plan<Real> &plan, Real *out) {
  for (std::size_t n = 0; n < plan.row; n += Lanes::lanes) {
    const Real *const w = window_of(plan, n);
    real_fours<Lanes> between;
    first_real_four<0>(x + n, plan.row, w, between);
    first_real_four<1>(x + n, plan.row, w, between);
    first_real_four<2>(x + n, plan.row, w, between);
    first_real_four<3>(x + n, plan.row, w, between);
    second_real_fours(between, radix_columns<Real>(plan, n, out));
  }
}

static void windowed_radix_16(const float *x, const radix_plan<float> &plan, float *out) {
  complex_radix<true, wide>(x, plan, out);
}
static void windowed_radix_16_double(const double *x, const radix_plan<double> &plan, double *out) {
  complex_radix<true, wide_double>(x, plan, out);
}
static void windowed_real_radix_16(const float *x, const radix_plan<float> &plan, float *out) {
  windowed_real_radix<wide>(x, plan, out);
}
static void windowed_real_radix_16_double(const double *x, const radix_plan<double> &plan, double *out) {
  windowed_real_radix<wide_double>(x, plan, out);
}
static void radix_16(const float *x, const radix_plan<float> &plan, float *out) {
  complex_radix<false, wide>(x, plan, out);
}
static void radix_16_double(const double *x, const radix_plan<double> &plan, double *out) {
  complex_radix<false, wide_double>(x, plan, out);
}

/// Columns that are put into the order of their bins at once.
static constexpr std::size_t tile_columns = wide_double::lanes;

/// out[16 n + k] = rows[k * stride + n], complex, for n < tile_columns. A complex value moves as one double. Interleaving
/// the first half of all values with the second moves the highest bit of an index to its end.
static inline void interleave_rows(const float *rows, std::size_t stride, float *out) {
  const auto *const from = reinterpret_cast<const double *>(rows);
  wide_double x[radix], y[radix];
  for (std::size_t k = 0; k < radix; ++k) x[k] = wide_double::load(from + k * stride);
  for (std::size_t i = 0; i < radix / 2; ++i) join_pairs(x[i], x[i + radix / 2], y[2 * i], y[2 * i + 1]);
  for (std::size_t i = 0; i < radix / 2; ++i) join_pairs(y[i], y[i + radix / 2], x[2 * i], x[2 * i + 1]);
  for (std::size_t i = 0; i < radix / 2; ++i) join_pairs(x[i], x[i + radix / 2], y[2 * i], y[2 * i + 1]);
  for (std::size_t i = 0; i < radix / 2; ++i) join_pairs(y[i], y[i + radix / 2], x[2 * i], x[2 * i + 1]);
  for (std::size_t k = 0; k < radix; ++k) store(reinterpret_cast<double *>(out) + k * tile_columns, x[k]);
}

static void weigh_and_rotate_rows(const float *rows, std::size_t stride, std::size_t first, const float *w, float c,
                                  float s, float *out, std::size_t n) {
  const weigh_and_rotate_step step{wide::broadcast(c), wide::broadcast_pair(-s, s)};
  constexpr std::size_t tile = radix * tile_columns;
  alignas(64) float bins[2 * tile];
  for (std::size_t count = 0; n > 0; n -= count, first += count, w += 2 * count, out += 2 * count) {
    const std::size_t skipped = first % tile, whole = tile - skipped;
    count = whole < n ? whole : n;
    interleave_rows(rows + 2 * ((first - skipped) / radix), stride, bins);
    go_over<into_caches>(step, bins + 2 * skipped, w, out, count);
  }
}
