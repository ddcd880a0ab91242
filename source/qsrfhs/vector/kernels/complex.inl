// Complex division and magnitudes. The order of the operations is part of the results. SPDX-License-Identifier: MIT

/// The factor 1 / |b|^2 of a division by b; not scaled, so that it leaves the range before b does.
static inline f8 reciprocal_power(f8 re, f8 im) {
  return broadcast(1.0F) / (re * re + im * im);
}

template <class Put>
static inline void divide_8(const float *x, f8 br, f8 bi, f8 r, float *out) {
  f8 ar, ai, a, b;
  split_in_lanes(load(x), load(x + 8), ar, ai);
  join_in_lanes((ar * br + ai * bi) * r, (ai * br - ar * bi) * r, a, b);
  Put::put(out, a);
  Put::put(out + 8, b);
}

struct divide_step {
  static constexpr std::size_t block = 8, x_width = 2, y_width = 2, out_width = 2;
  template <class Put>
  inline void run(const float *x, const float *y, float *out) const {
    f8 br, bi;
    split_in_lanes(load(y), load(y + 8), br, bi);
    divide_8<Put>(x, br, bi, reciprocal_power(br, bi), out);
  }
};

struct divide_by_value_step {
  static constexpr std::size_t block = 8, x_width = 2, y_width = 0, out_width = 2;
  f8 br, bi, r;
  template <class Put>
  inline void run(const float *x, const float *, float *out) const {
    divide_8<Put>(x, br, bi, r, out);
  }
};

static inline f8 power_8(const float *x) {
  f8 re, im;
  load_complex(x, re, im);
  return re * re + im * im;
}

struct magnitude_step {
  static constexpr std::size_t block = 8, x_width = 2, y_width = 0, out_width = 1;
  template <class Put>
  inline void run(const float *x, const float *, float *out) const {
    Put::put(out, square_root(power_8(x)));
  }
};

struct magnitude_squared_step {
  static constexpr std::size_t block = 8, x_width = 2, y_width = 0, out_width = 1;
  template <class Put>
  inline void run(const float *x, const float *, float *out) const {
    Put::put(out, power_8(x));
  }
};

static void divide(const float *x, const float *y, float *out, std::size_t n) {
  run(divide_step{}, x, y, out, n);
}

static void divide_by_value(const float *x, const float *v, float *out, std::size_t n) {
  const f8 br = broadcast(v[0]), bi = broadcast(v[1]);
  run(divide_by_value_step{br, bi, reciprocal_power(br, bi)}, x, x, out, n);
}

static void magnitude(const float *x, float *out, std::size_t n) {
  run(magnitude_step{}, x, x, out, n);
}

static void magnitude_squared(const float *x, float *out, std::size_t n) {
  run(magnitude_squared_step{}, x, x, out, n);
}
