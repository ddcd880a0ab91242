// Values of windows that are polynomials of a squared sine. SPDX-License-Identifier: MIT

template <std::size_t terms, class Real>
static inline void window_values_of(const turned_angles &angles, const double *polynomial, Real *out, Real *mirror,
                                    std::size_t n) {
  const wide_double s = wide_double::broadcast(angles.sine), c = wide_double::broadcast(angles.cosine);
  for (std::size_t k = 0; k < n; k += wide_double::lanes) {
    const wide_double sine = s * wide_double::load(angles.cosines + k) + c * wide_double::load(angles.sines + k);
    const wide_double u = sine * sine;
    wide_double w = wide_double::broadcast(polynomial[terms - 1]);
    for (std::size_t j = terms - 1; j-- > 0;) w = w * u + wide_double::broadcast(polynomial[j]);
    store(out + k, w);
    store(mirror + n - k - wide_double::lanes, reverse(w));
  }
}

template <class Real>
static inline void any_window_values(const turned_angles &angles, const double *polynomial, std::size_t terms,
                                     Real *out, Real *mirror, std::size_t n) {
  switch (terms) {
    case 2:
      return window_values_of<2>(angles, polynomial, out, mirror, n);
    case 3:
      return window_values_of<3>(angles, polynomial, out, mirror, n);
    case 4:
      return window_values_of<4>(angles, polynomial, out, mirror, n);
    case 5:
      return window_values_of<5>(angles, polynomial, out, mirror, n);
    default:
      return window_values_of<7>(angles, polynomial, out, mirror, n);
  }
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

static void window_values(const turned_angles &angles, const double *polynomial, std::size_t terms, float *out,
                          float *mirror, std::size_t n) {
  any_window_values(angles, polynomial, terms, out, mirror, n);
}
static void window_values_double(const turned_angles &angles, const double *polynomial, std::size_t terms, double *out,
                                 double *mirror, std::size_t n) {
  any_window_values(angles, polynomial, terms, out, mirror, n);
}
