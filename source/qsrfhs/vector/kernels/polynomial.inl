// Horner's scheme. SPDX-License-Identifier: MIT

/// How many samples of a real polynomial are evaluated. With few enough coefficients all n; otherwise only those that
/// the blocks of 16 leave over, in all builds but the baseline also those in front of the first boundary of
/// 32 bytes in the output.
static std::size_t polynomial_reach(const float *out, std::size_t n, std::size_t m) {
  if (m <= polynomial_coefficients) return n;
  std::size_t lead = 0;
  if constexpr (polynomial_boundary != 0) {
    const std::size_t beyond = reinterpret_cast<std::size_t>(out) % polynomial_boundary;
    if (beyond != 0) lead = (polynomial_boundary - beyond) / sizeof(float);
    if (lead > n) lead = n;
  }
  return lead + (n - lead) % 16;
}

// Several groups run side by side: one alone would wait for each of its operations.

struct polynomial_step {
  static constexpr std::size_t groups = 8, x_width = 1, y_width = 0, out_width = 1;
  const float *c;
  std::size_t m;
  template <class Put, std::size_t count>
  inline void run(const float *x, const float *, float *out) const {
    wide acc[count];
    for (wide &a : acc) a = wide::broadcast(c[m - 1]);
    for (std::size_t k = m - 1; k-- > 0;) {
      const wide ck = wide::broadcast(c[k]);
      for (std::size_t j = 0; j < count; ++j) acc[j] = multiply_add(acc[j], wide::load(x + wide::lanes * j), ck);
    }
    for (std::size_t j = 0; j < count; ++j) Put::put(out + wide::lanes * j, acc[j]);
  }
};

struct complex_polynomial_step {
  static constexpr std::size_t groups = 4, x_width = 1, y_width = 0, out_width = 2;
  const float *c;
  std::size_t m;
  template <class Put, std::size_t count>
  inline void run(const float *x, const float *, float *out) const {
    wide re[count], im[count];
    for (std::size_t j = 0; j < count; ++j) {
      re[j] = wide::broadcast(c[2 * m - 2]);
      im[j] = wide::broadcast(c[2 * m - 1]);
    }
    for (std::size_t k = m - 1; k-- > 0;) {
      const wide ck_re = wide::broadcast(c[2 * k]), ck_im = wide::broadcast(c[2 * k + 1]);
      for (std::size_t j = 0; j < count; ++j) {
        const wide v = wide::load(x + wide::lanes * j);
        re[j] = multiply_add(re[j], v, ck_re);
        im[j] = multiply_add(im[j], v, ck_im);
      }
    }
    for (std::size_t j = 0; j < count; ++j) store_complex<Put>(out + 2 * wide::lanes * j, re[j], im[j]);
  }
};

static void polynomial(const float *x, const float *c, std::size_t m, float *out, std::size_t n) {
  run(polynomial_step{c, m}, x, x, out, n);
}

static void complex_polynomial(const float *x, const float *c, std::size_t m, float *out, part_of_all n) {
  run(complex_polynomial_step{c, m}, x, x, out, n);
}
