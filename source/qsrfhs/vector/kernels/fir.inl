// Filters with fixed taps, and products of spectra, in both precisions. Every output is summed from the first tap to
// the last, wherever in a register it lies. SPDX-License-Identifier: MIT

/// Real taps.
template <class Lanes>
struct real_taps {
  static constexpr std::size_t parts = 1;  // of a tap
  Lanes sum;
  template <class Real>
  void begin(const Real *tap, const Real *x) {
    sum = load_repeated(tap) * load(x);
  }
  template <class Real>
  void add(const Real *tap, const Real *x) {
    sum = sum + load_repeated(tap) * load(x);
  }
  [[nodiscard]] Lanes total() const { return sum; }
};

/// Complex taps and samples: the samples times the taps' real and imaginary parts, joined at the end.
template <class Lanes>
struct complex_taps {
  static constexpr std::size_t parts = 2;
  Lanes by_re, by_im;
  template <class Real>
  void begin(const Real *tap, const Real *x) {
    const Lanes samples = load(x);
    by_re = load_repeated(tap) * samples;
    by_im = load_repeated(tap + 1) * samples;
  }
  template <class Real>
  void add(const Real *tap, const Real *x) {
    const Lanes samples = load(x);
    by_re = by_re + load_repeated(tap) * samples;
    by_im = by_im + load_repeated(tap + 1) * samples;
  }
  [[nodiscard]] Lanes total() const { return subtract_and_add(by_re, swap_pairs(by_im)); }
};

/// Outputs of as many registers as there are sums. `x` is the sample of the first output and the first tap.
template <std::size_t registers, class Sum, class Real>
static inline void filter_registers(const Real *x, const Real *taps, std::size_t count, std::size_t width, Real *out) {
  constexpr std::size_t lanes = 32 / sizeof(Real);
  Sum sums[registers];
  for (std::size_t r = 0; r < registers; ++r) sums[r].begin(taps, x + lanes * r);
  for (std::size_t j = 1; j < count; ++j) {
    x -= width;
    taps += Sum::parts;
    for (std::size_t r = 0; r < registers; ++r) sums[r].add(taps, x + lanes * r);
  }
  for (std::size_t r = 0; r < registers; ++r) store(out + lanes * r, sums[r].total());
}

template <class Sum, class Real>
static inline void filter(const Real *x, const Real *taps, std::size_t count, std::size_t width, Real *out,
                          std::size_t n) {
  constexpr std::size_t lanes = 32 / sizeof(Real), most = filter_sums / Sum::parts;
  std::size_t k = 0;
  for (; k + most * lanes <= n; k += most * lanes) filter_registers<most, Sum>(x + k, taps, count, width, out + k);
  if (k + most / 2 * lanes <= n) {
    filter_registers<most / 2, Sum>(x + k, taps, count, width, out + k);
    k += most / 2 * lanes;
  }
  for (; k + lanes <= n; k += lanes) filter_registers<1, Sum>(x + k, taps, count, width, out + k);
  if (k == n) return;
  Real last[lanes];
  filter_registers<1, Sum>(x + k, taps, count, width, last);
  for (std::size_t l = 0; k + l < n; ++l) out[k + l] = last[l];
}

static void fir(const float *x, const float *taps, std::size_t count, std::size_t width, float *out, std::size_t n) {
  filter<real_taps<f8>>(x, taps, count, width, out, n);
}
static void fir_double(const double *x, const double *taps, std::size_t count, std::size_t width, double *out,
                       std::size_t n) {
  filter<real_taps<d4>>(x, taps, count, width, out, n);
}
static void complex_fir(const float *x, const float *taps, std::size_t count, float *out, std::size_t n) {
  filter<complex_taps<f8>>(x, taps, count, 2, out, 2 * n);
}
static void complex_fir_double(const double *x, const double *taps, std::size_t count, double *out, std::size_t n) {
  filter<complex_taps<d4>>(x, taps, count, 2, out, 2 * n);
}

static void multiply_double(double *a, const double *b, std::size_t n) {
  std::size_t k = 0;
  for (; k + 2 <= n; k += 2) store(a + 2 * k, multiply_pairs(load(a + 2 * k), load(b + 2 * k)));
  if (k == n) return;
  const double re = a[2 * k] * b[2 * k] - a[2 * k + 1] * b[2 * k + 1];
  a[2 * k + 1] = a[2 * k + 1] * b[2 * k] + a[2 * k] * b[2 * k + 1];
  a[2 * k] = re;
}
