// Complex products, division and magnitudes. The order of the operations is part of the results.
// SPDX-License-Identifier: MIT

/// Products of complex values, whose real and imaginary parts stand side by side.
template <class Lanes>
static inline Lanes multiply_pairs(Lanes a, Lanes b) {
  return multiply_subtract_and_add(a, even_twice(b), swap_pairs(a) * odd_twice(b));
}

/// The factor 1 / |b|^2 of a division by b; not scaled, so that it leaves the range before b does.
static inline wide reciprocal_power(wide re, wide im) {
  return wide::broadcast(1.0F) / (re * re + im * im);
}

template <class Put>
static inline void divide_group(const float *x, wide br, wide bi, wide r, float *out) {
  wide ar, ai, a, b;
  split_in_lanes(wide::load(x), wide::load(x + wide::lanes), ar, ai);
  join_in_lanes((ar * br + ai * bi) * r, (ai * br - ar * bi) * r, a, b);
  Put::put(out, a);
  Put::put(out + wide::lanes, b);
}

struct divide_step {
  static constexpr std::size_t groups = 1, x_width = 2, y_width = 2, out_width = 2;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *y, float *out) const {
    wide br, bi;
    split_in_lanes(wide::load(y), wide::load(y + wide::lanes), br, bi);
    divide_group<Put>(x, br, bi, reciprocal_power(br, bi), out);
  }
};

struct divide_by_value_step {
  static constexpr std::size_t groups = 1, x_width = 2, y_width = 0, out_width = 2;
  wide br, bi, r;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *, float *out) const {
    divide_group<Put>(x, br, bi, r, out);
  }
};

static inline wide power_of(const float *x) {
  wide re, im;
  load_complex(x, re, im);
  return re * re + im * im;
}

struct magnitude_step {
  static constexpr std::size_t groups = 1, x_width = 2, y_width = 0, out_width = 1;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *, float *out) const {
    Put::put(out, square_root(power_of(x)));
  }
};

struct magnitude_squared_step {
  static constexpr std::size_t groups = 1, x_width = 2, y_width = 0, out_width = 1;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *, float *out) const {
    Put::put(out, power_of(x));
  }
};

static void divide(const float *x, const float *y, float *out, part_of_all n) {
  run(divide_step{}, x, y, out, n);
}

static void divide_by_value(const float *x, const float *v, float *out, part_of_all n) {
  const wide br = wide::broadcast(v[0]), bi = wide::broadcast(v[1]);
  run(divide_by_value_step{br, bi, reciprocal_power(br, bi)}, x, x, out, n);
}

static void magnitude(const float *x, float *out, std::size_t n) {
  run(magnitude_step{}, x, x, out, n);
}

static void magnitude_squared(const float *x, float *out, std::size_t n) {
  run(magnitude_squared_step{}, x, x, out, n);
}
