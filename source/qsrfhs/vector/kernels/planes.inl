// Samples of either precision to planes of doubles and back. SPDX-License-Identifier: MIT

template <class Real>
static inline void split_complex(const Real *x, double *re, double *im, std::size_t n) {
  constexpr std::size_t lanes = wide_double::lanes;
  std::size_t k = 0;
  for (; k + lanes <= n; k += lanes) {
    wide_double res, ims;
    split_pairs(wide_double::load(x + 2 * k), wide_double::load(x + 2 * k + lanes), res, ims);
    store(re + k, res);
    store(im + k, ims);
  }
  for (; k < n; ++k) {
    re[k] = x[2 * k];
    im[k] = x[2 * k + 1];
  }
}

template <class Real>
static inline void join_complex(const double *re, const double *im, Real *out, std::size_t n) {
  constexpr std::size_t lanes = wide_double::lanes;
  std::size_t k = 0;
  for (; k + lanes <= n; k += lanes) {
    wide_double a, b;
    join_pairs(wide_double::load(re + k), wide_double::load(im + k), a, b);
    store(out + 2 * k, a);
    store(out + 2 * k + lanes, b);
  }
  for (; k < n; ++k) {
    out[2 * k] = static_cast<Real>(re[k]);
    out[2 * k + 1] = static_cast<Real>(im[k]);
  }
}

static void widen(const float *x, double *out, std::size_t n) {
  constexpr std::size_t lanes = wide_double::lanes;
  std::size_t k = 0;
  for (; k + lanes <= n; k += lanes) store(out + k, wide_double::load(x + k));
  for (; k < n; ++k) out[k] = x[k];
}
static void narrow(const double *x, float *out, std::size_t n) {
  constexpr std::size_t lanes = wide_double::lanes;
  std::size_t k = 0;
  for (; k + lanes <= n; k += lanes) store(out + k, wide_double::load(x + k));
  for (; k < n; ++k) out[k] = static_cast<float>(x[k]);
}
static void split(const float *x, double *re, double *im, std::size_t n) {
  split_complex(x, re, im, n);
}
static void split_double(const double *x, double *re, double *im, std::size_t n) {
  split_complex(x, re, im, n);
}
static void join_planes(const double *re, const double *im, float *out, std::size_t n) {
  join_complex(re, im, out, n);
}
static void join_planes_double(const double *re, const double *im, double *out, std::size_t n) {
  join_complex(re, im, out, n);
}

/// 0 times a value that is not finite is not 0. Four sums that do not wait for each other, without an early end.
static bool is_finite(const double *x, std::size_t n) {
  constexpr std::size_t lanes = wide_double::lanes, sums = 4;
  const wide_double zero = wide_double::broadcast(0);
  wide_double sum[sums] = {zero, zero, zero, zero};
  std::size_t k = 0;
  for (; k + sums * lanes <= n; k += sums * lanes)
    for (std::size_t j = 0; j < sums; ++j) sum[j] = sum[j] + zero * wide_double::load(x + k + lanes * j);
  double each[lanes], rest = 0;
  store(each, sum[0] + sum[1] + (sum[2] + sum[3]));
  for (const double s : each) rest += s;
  for (; k < n; ++k) rest += 0 * x[k];
  return rest == 0;
}
