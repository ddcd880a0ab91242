// The loops of the windowed FFT. SPDX-License-Identifier: MIT

// Groups of eight powers stay in the order of split_in_lanes until order_power: that saves two shuffles in each group
// of each segment.
template <bool Add>
static inline void power_8(const float *x, float *power) {
  f8 re, im;
  split_in_lanes(load(x), load(x + 8), re, im);
  const f8 squares = re * re + im * im;
  store(power, Add ? load(power) + squares : squares);
}

template <bool Add>
static inline void power_1(const float *x, float *power) {
  const float squares = x[0] * x[0] + x[1] * x[1];
  *power = Add ? *power + squares : squares;
}

static inline void window_8(const float *x, const float *w, float *out) {
  store(out, load(x) * load_twice(w));
  store(out + 8, load(x + 8) * load_twice(w + 4));
}

static inline void window_1(const float *x, const float *w, float *out) {
  out[0] = x[0] * *w;
  out[1] = x[1] * *w;
}

static void copy(const float *x, float *out, std::size_t n) {
  std::size_t k = 0;
  for (; k + 4 <= n; k += 4) store(out + 2 * k, load(x + 2 * k));
  for (; k < n; ++k) {
    out[2 * k] = x[2 * k];
    out[2 * k + 1] = x[2 * k + 1];
  }
}

static void apply_window(const float *x, const float *w, float *out, std::size_t n) {
  std::size_t k = 0;
  for (; k + 8 <= n; k += 8) window_8(x + 2 * k, w + k, out + 2 * k);
  for (; k < n; ++k) window_1(x + 2 * k, w + k, out + 2 * k);
}

template <bool Add>
static inline void all_powers(const float *x, float *power, std::size_t n) {
  std::size_t k = 0;
  for (; k + 8 <= n; k += 8) power_8<Add>(x + 2 * k, power + k);
  for (; k < n; ++k) power_1<Add>(x + 2 * k, power + k);
}

static void store_power(const float *x, float *power, std::size_t n) {
  all_powers<false>(x, power, n);
}

static void accumulate_power(const float *x, float *power, std::size_t n) {
  all_powers<true>(x, power, n);
}

template <bool Add>
static inline void power_then_window_8(float *work, float *power, const float *next, const float *w) {
  power_8<Add>(work, power);
  window_8(next, w, work);
}

template <bool Add>
static inline void power_then_window(float *work, float *power, const float *next, const float *w, const float *ahead,
                                     std::size_t ahead_count, std::size_t n) {
  std::size_t k = 0;
  for (; k + 8 <= n && k < ahead_count; k += 8) {
    _mm_prefetch(reinterpret_cast<const char *>(ahead + 2 * k), _MM_HINT_T1);
    power_then_window_8<Add>(work + 2 * k, power + k, next + 2 * k, w + k);
  }
  for (; k + 8 <= n; k += 8) power_then_window_8<Add>(work + 2 * k, power + k, next + 2 * k, w + k);
  for (; k < n; ++k) {
    power_1<Add>(work + 2 * k, power + k);
    window_1(next + 2 * k, w + k, work + 2 * k);
  }
}

static void store_power_then_apply_window(float *work, float *power, const float *next, const float *w,
                                          const float *ahead, std::size_t ahead_count, std::size_t n) {
  power_then_window<false>(work, power, next, w, ahead, ahead_count, n);
}

static void accumulate_power_then_apply_window(float *work, float *power, const float *next, const float *w,
                                               const float *ahead, std::size_t ahead_count, std::size_t n) {
  power_then_window<true>(work, power, next, w, ahead, ahead_count, n);
}

static void order_power(float *power, std::size_t n) {
  for (std::size_t k = 0; k + 8 <= n; k += 8) store(power + k, order_lanes(load(power + k)));
}

static void add(const float *x, float *sum, std::size_t n) {
  std::size_t k = 0;
  for (; k + 8 <= n; k += 8) store(sum + k, load(sum + k) + load(x + k));
  for (; k < n; ++k) sum[k] += x[k];
}

static void scale(float *x, float factor, std::size_t n) {
  const f8 factors = broadcast(factor);
  std::size_t k = 0;
  for (; k + 8 <= n; k += 8) store(x + k, load(x + k) * factors);
  for (; k < n; ++k) x[k] *= factor;
}
