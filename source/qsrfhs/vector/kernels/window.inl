// Windows that are polynomials of a squared sine, onto samples from both ends. SPDX-License-Identifier: MIT

template <std::size_t terms, class Real>
static inline void window_values(const turned_angles &angles, std::size_t first, const double *polynomial, Real *out,
                                 Real *mirror, std::size_t n) {
  const wide_double s = wide_double::broadcast(angles.sine), c = wide_double::broadcast(angles.cosine);
  for (std::size_t k = 0; k < n; k += wide_double::lanes) {
    const wide_double sine =
        s * wide_double::load(angles.cosines + first + k) + c * wide_double::load(angles.sines + first + k);
    const wide_double u = sine * sine;
    wide_double w = wide_double::broadcast(polynomial[terms - 1]);
    for (std::size_t j = terms - 1; j-- > 0;) w = w * u + wide_double::broadcast(polynomial[j]);
    store(out + k, w);
    store(mirror + n - k - wide_double::lanes, reverse(w));
  }
}

/// n samples of `parts` times a weight for each, n a multiple of 16.
template <std::size_t parts>
static inline void weigh_samples(float *x, const float *w, std::size_t n) {
  for (std::size_t k = 0; k < parts * n; k += wide::lanes)
    store(x + k, wide::load(x + k) * (parts == 2 ? wide::load_twice(w + k / 2) : wide::load(w + k)));
}
template <std::size_t parts>
static inline void weigh_samples(double *x, const double *w, std::size_t n) {
  constexpr std::size_t lanes = wide_double::lanes;
  for (std::size_t k = 0; k < n; k += lanes, x += parts * lanes) {
    const wide_double weights = wide_double::load(w + k);
    if (parts == 1) {
      store(x, wide_double::load(x) * weights);
    } else {
      wide_double low, high;
      join_pairs(weights, weights, low, high);
      store(x, wide_double::load(x) * low);
      store(x + lanes, wide_double::load(x + lanes) * high);
    }
  }
}

/// In pieces so short that the processor computes values of one while it waits for the samples of another.
template <std::size_t terms, std::size_t parts, class Real>
static inline void weigh_both_ends(const turned_angles &angles, const double *polynomial, Real *rising, Real *falling,
                                   std::size_t n) {
  constexpr std::size_t piece = 64;
  Real w[piece], mirror[piece];
  std::size_t k = 0;
  for (; k + piece <= n; k += piece) {
    window_values<terms>(angles, k, polynomial, w, mirror, piece);
    weigh_samples<parts>(rising + parts * k, w, piece);
    weigh_samples<parts>(falling + parts * (n - k - piece), mirror, piece);
  }
  const std::size_t left = n - k, whole = (left + 7) / 8 * 8;
  if (left == 0) return;
  window_values<terms>(angles, k, polynomial, w, mirror, whole);
  for (std::size_t i = 0; i < parts * left; ++i) {
    rising[parts * k + i] *= w[i / parts];
    falling[i] *= mirror[whole - left + i / parts];
  }
}

template <std::size_t parts, class Real>
static inline void weigh_ends(const turned_angles &angles, const double *polynomial, std::size_t terms, Real *rising,
                              Real *falling, std::size_t n) {
  switch (terms) {
    case 2:
      return weigh_both_ends<2, parts>(angles, polynomial, rising, falling, n);
    case 3:
      return weigh_both_ends<3, parts>(angles, polynomial, rising, falling, n);
    case 4:
      return weigh_both_ends<4, parts>(angles, polynomial, rising, falling, n);
    case 5:
      return weigh_both_ends<5, parts>(angles, polynomial, rising, falling, n);
    default:
      return weigh_both_ends<7, parts>(angles, polynomial, rising, falling, n);
  }
}

static void cosine_window(const turned_angles &angles, const double *polynomial, std::size_t terms, float *rising,
                          float *falling, std::size_t n) {
  weigh_ends<1>(angles, polynomial, terms, rising, falling, n);
}
static void cosine_window_double(const turned_angles &angles, const double *polynomial, std::size_t terms,
                                 double *rising, double *falling, std::size_t n) {
  weigh_ends<1>(angles, polynomial, terms, rising, falling, n);
}
static void complex_cosine_window(const turned_angles &angles, const double *polynomial, std::size_t terms,
                                  float *rising, float *falling, std::size_t n) {
  weigh_ends<2>(angles, polynomial, terms, rising, falling, n);
}
static void complex_cosine_window_double(const turned_angles &angles, const double *polynomial, std::size_t terms,
                                         double *rising, double *falling, std::size_t n) {
  weigh_ends<2>(angles, polynomial, terms, rising, falling, n);
}

struct weigh_double_step {
  static constexpr std::size_t groups = 1, x_width = 1, y_width = 1, out_width = 1;
  template <class Put, std::size_t>
  inline void run(const double *x, const double *w, double *out) const {
    for (std::size_t at = 0; at < wide::lanes; at += wide_double::lanes)
      Put::put(out + at, wide_double::load(x + at) * wide_double::load(w + at));
  }
};

static void weigh_double(const double *x, const double *w, double *out, std::size_t n) {
  go_over<into_caches>(weigh_double_step{}, x, w, out, n);
}
