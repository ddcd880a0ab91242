// The loops of the windowed FFT. SPDX-License-Identifier: MIT

struct copy_step {
  static constexpr std::size_t groups = 1, x_width = 1, y_width = 0, out_width = 1;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *, float *out) const {
    Put::put(out, wide::load(x));
  }
};

struct add_step {
  static constexpr std::size_t groups = 1, x_width = 1, y_width = 1, out_width = 1;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *y, float *out) const {
    Put::put(out, wide::load(x) + wide::load(y));
  }
};

struct scale_step {
  static constexpr std::size_t groups = 1, x_width = 1, y_width = 0, out_width = 1;
  wide factor;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *, float *out) const {
    Put::put(out, wide::load(x) * factor);
  }
};

struct scale_and_shift_step {
  static constexpr std::size_t groups = 1, x_width = 1, y_width = 0, out_width = 1;
  wide factor, offset;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *, float *out) const {
    Put::put(out, wide::load(x) * factor + offset);
  }
};

template <class Lanes>
static inline void window_group(const float *x, const float *w, float *out) {
  store(out, Lanes::load(x) * Lanes::load_twice(w));
  store(out + Lanes::lanes, Lanes::load(x + Lanes::lanes) * Lanes::load_twice(w + Lanes::lanes / 2));
}

static inline void window_1(const float *x, const float *w, float *out) {
  out[0] = x[0] * *w;
  out[1] = x[1] * *w;
}

struct window_step {
  static constexpr std::size_t groups = 1, x_width = 2, y_width = 1, out_width = 2;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *w, float *out) const {
    window_group<wide>(x, w, out);
  }
};

// Groups of powers stay in the order of split_in_lanes until order_power: that saves two shuffles in each group of each
// segment where it is not the order of the samples. Whole groups come first, of sixteen where registers hold so many,
// then of eight; the functions that go over groups begin with element k and tell where they ended.

template <class Lanes, bool Add>
static inline void power_of_group(const float *x, float *power) {
  Lanes re, im;
  split_in_lanes(Lanes::load(x), Lanes::load(x + Lanes::lanes), re, im);
  const Lanes squares = re * re + im * im;
  store(power, Add ? Lanes::load(power) + squares : squares);
}

template <bool Add>
static inline void power_1(const float *x, float *power) {
  const float squares = x[0] * x[0] + x[1] * x[1];
  *power = Add ? *power + squares : squares;
}

template <class Lanes, bool Add>
static inline std::size_t powers_of_groups(const float *x, float *power, std::size_t k, std::size_t n) {
  for (; k + Lanes::lanes <= n; k += Lanes::lanes) power_of_group<Lanes, Add>(x + 2 * k, power + k);
  return k;
}

template <bool Add>
static inline void all_powers(const float *x, float *power, std::size_t n) {
  std::size_t k = powers_of_groups<wide, Add>(x, power, 0, n);
  k = powers_of_groups<f8, Add>(x, power, k, n);
  for (; k < n; ++k) power_1<Add>(x + 2 * k, power + k);
}

template <class Lanes>
static inline std::size_t order_groups(float *power, std::size_t k, std::size_t n) {
  for (; k + Lanes::lanes <= n; k += Lanes::lanes) store(power + k, order_lanes(Lanes::load(power + k)));
  return k;
}

template <class Lanes, bool Add>
static inline void power_then_window_group(float *work, float *power, const float *next, const float *w) {
  power_of_group<Lanes, Add>(work, power);
  window_group<Lanes>(next, w, work);
}

template <class Lanes, bool Add>
static inline std::size_t power_then_window_groups(float *work, float *power, const float *next, const float *w,
                                                   const float *ahead, std::size_t ahead_count, std::size_t k,
                                                   std::size_t n) {
  constexpr std::size_t line = 8;  // samples in a line of the caches
  for (; k + Lanes::lanes <= n && k < ahead_count; k += Lanes::lanes) {
    for (std::size_t i = k; i < k + Lanes::lanes; i += line)
      _mm_prefetch(reinterpret_cast<const char *>(ahead + 2 * i), _MM_HINT_T1);
    power_then_window_group<Lanes, Add>(work + 2 * k, power + k, next + 2 * k, w + k);
  }
  for (; k + Lanes::lanes <= n; k += Lanes::lanes)
    power_then_window_group<Lanes, Add>(work + 2 * k, power + k, next + 2 * k, w + k);
  return k;
}

template <bool Add>
static inline void power_then_window(float *work, float *power, const float *next, const float *w, const float *ahead,
                                     std::size_t ahead_count, std::size_t n) {
  std::size_t k = power_then_window_groups<wide, Add>(work, power, next, w, ahead, ahead_count, 0, n);
  k = power_then_window_groups<f8, Add>(work, power, next, w, ahead, ahead_count, k, n);
  for (; k < n; ++k) {
    power_1<Add>(work + 2 * k, power + k);
    window_1(next + 2 * k, w + k, work + 2 * k);
  }
}

static void copy(const float *x, float *out, std::size_t n) {
  go_over<into_caches>(copy_step{}, x, x, out, 2 * n);
}

static void apply_window(const float *x, const float *w, float *out, std::size_t n) {
  go_over<into_caches>(window_step{}, x, w, out, n);
}

static void store_power(const float *x, float *power, std::size_t n) {
  all_powers<false>(x, power, n);
}

static void accumulate_power(const float *x, float *power, std::size_t n) {
  all_powers<true>(x, power, n);
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
  order_groups<f8>(power, order_groups<wide>(power, 0, n), n);
}

static void add(const float *x, float *sum, std::size_t n) {
  go_over<into_caches>(add_step{}, sum, x, sum, n);
}

static void scale(float *x, float factor, std::size_t n) {
  go_over<into_caches>(scale_step{wide::broadcast(factor)}, x, x, x, n);
}

static void scale_and_shift(float *x, float factor, float offset, std::size_t n) {
  run(scale_and_shift_step{wide::broadcast(factor), wide::broadcast(offset)}, x, x, x, n);
}
