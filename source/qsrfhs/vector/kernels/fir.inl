// Filters with fixed taps, and products of spectra, in both precisions. Every output is summed from the first tap to
// the last, wherever in a register it lies. SPDX-License-Identifier: MIT

/// Real taps.
template <class Lanes>
struct real_taps {
  static constexpr std::size_t parts = 1, lanes = Lanes::lanes;  // parts of a tap
  Lanes sum;
  template <class Real>
  void begin(const Real *tap, const Real *x) {
    sum = Lanes::broadcast(*tap) * Lanes::load(x);
  }
  template <class Real>
  void add(const Real *tap, const Real *x) {
    sum = multiply_add(Lanes::broadcast(*tap), Lanes::load(x), sum);
  }
  [[nodiscard]] Lanes total() const { return sum; }
};

/// Complex taps and samples: the samples times the taps' real and imaginary parts, joined at the end.
template <class Lanes>
struct complex_taps {
  static constexpr std::size_t parts = 2, lanes = Lanes::lanes;
  Lanes by_re, by_im;
  template <class Real>
  void begin(const Real *tap, const Real *x) {
    const Lanes samples = in_register(Lanes::load(x));
    by_re = Lanes::broadcast(tap[0]) * samples;
    by_im = Lanes::broadcast(tap[1]) * samples;
  }
  template <class Real>
  void add(const Real *tap, const Real *x) {
    const Lanes samples = in_register(Lanes::load(x));
    by_re = multiply_add(Lanes::broadcast(tap[0]), samples, by_re);
    by_im = multiply_add(Lanes::broadcast(tap[1]), samples, by_im);
  }
  [[nodiscard]] Lanes total() const { return subtract_and_add(by_re, swap_pairs(by_im)); }
};

/// Outputs of as many registers as there are sums. `x` is the sample of the first output and the first tap.
template <std::size_t registers, class Sum, class Real>
static inline void filter_registers(const Real *x, const Real *taps, std::size_t count, std::size_t width, Real *out) {
  Sum sums[registers];
  for (std::size_t r = 0; r < registers; ++r) sums[r].begin(taps, x + Sum::lanes * r);
  for (std::size_t j = 1; j < count; ++j) {
    x -= width;
    taps += Sum::parts;
    for (std::size_t r = 0; r < registers; ++r) sums[r].add(taps, x + Sum::lanes * r);
  }
  for (std::size_t r = 0; r < registers; ++r) store(out + Sum::lanes * r, sums[r].total());
}

/// Whole blocks of `registers` registers, from output k on. Where they ended.
template <std::size_t registers, class Sum, class Real>
static inline std::size_t filter_blocks(const Real *x, const Real *taps, std::size_t count, std::size_t width,
                                        Real *out, std::size_t k, std::size_t n) {
  constexpr std::size_t block = registers * Sum::lanes;
  for (; k + block <= n; k += block) filter_registers<registers, Sum>(x + k, taps, count, width, out + k);
  return k;
}

/// In registers that are as wide as they get, as long as there are outputs for them.
template <class Wide, class Narrow, class Real>
static inline void filter(const Real *x, const Real *taps, std::size_t count, std::size_t width, Real *out,
                          std::size_t n) {
  constexpr std::size_t most = filter_sums / Wide::parts;
  std::size_t k = filter_blocks<most, Wide>(x, taps, count, width, out, 0, n);
  k = filter_blocks<most / 2, Wide>(x, taps, count, width, out, k, n);
  k = filter_blocks<1, Wide>(x, taps, count, width, out, k, n);
  k = filter_blocks<1, Narrow>(x, taps, count, width, out, k, n);
  if (k == n) return;
  Real last[Narrow::lanes];
  filter_registers<1, Narrow>(x + k, taps, count, width, last);
  for (std::size_t l = 0; k + l < n; ++l) out[k + l] = last[l];
}

static void fir(const float *x, const float *taps, std::size_t count, std::size_t width, float *out, std::size_t n) {
  filter<real_taps<wide>, real_taps<f8>>(x, taps, count, width, out, n);
}
static void fir_double(const double *x, const double *taps, std::size_t count, std::size_t width, double *out,
                       std::size_t n) {
  filter<real_taps<wide_double>, real_taps<d4>>(x, taps, count, width, out, n);
}
static void complex_fir(const float *x, const float *taps, std::size_t count, float *out, std::size_t n) {
  filter<complex_taps<wide>, complex_taps<f8>>(x, taps, count, 2, out, 2 * n);
}
static void complex_fir_double(const double *x, const double *taps, std::size_t count, double *out, std::size_t n) {
  filter<complex_taps<wide_double>, complex_taps<d4>>(x, taps, count, 2, out, 2 * n);
}

struct multiply_double_step {
  static constexpr std::size_t groups = 1, x_width = 2, y_width = 2, out_width = 2;
  template <class Put, std::size_t>
  inline void run(const double *x, const double *y, double *out) const {
    for (std::size_t at = 0; at < 2 * wide::lanes; at += wide_double::lanes)
      Put::put(out + at, multiply_pairs(wide_double::load(x + at), wide_double::load(y + at)));
  }
};

static void multiply_double(const double *a, const double *b, double *out, std::size_t n) {
  go_over<into_caches>(multiply_double_step{}, a, b, out, n);
}
