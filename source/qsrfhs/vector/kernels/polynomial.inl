// Horner's scheme, each multiplication and addition rounded by itself. SPDX-License-Identifier: MIT

/// How many samples of a real polynomial are evaluated. With few enough coefficients all n; otherwise only those that
/// the blocks of 16 leave over, in the AVX build also those in front of the first boundary of 32 bytes in the output.
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

struct polynomial_step {
  static constexpr std::size_t block = 32, x_width = 1, y_width = 0, out_width = 1;
  const float *c;
  std::size_t m;
  inline void operator()(const float *x, const float *, float *out) const {
    const f8 x0 = load(x), x1 = load(x + 8), x2 = load(x + 16), x3 = load(x + 24);
    f8 a0 = broadcast(c[m - 1]), a1 = a0, a2 = a0, a3 = a0;
    for (std::size_t k = m - 1; k-- > 0;) {
      const f8 ck = broadcast(c[k]);
      a0 = a0 * x0 + ck;
      a1 = a1 * x1 + ck;
      a2 = a2 * x2 + ck;
      a3 = a3 * x3 + ck;
    }
    store(out, a0);
    store(out + 8, a1);
    store(out + 16, a2);
    store(out + 24, a3);
  }
};

struct complex_polynomial_step {
  static constexpr std::size_t block = 16, x_width = 1, y_width = 0, out_width = 2;
  const float *c;
  std::size_t m;
  inline void operator()(const float *x, const float *, float *out) const {
    const f8 x0 = load(x), x1 = load(x + 8);
    f8 re0 = broadcast(c[2 * m - 2]), im0 = broadcast(c[2 * m - 1]), re1 = re0, im1 = im0;
    for (std::size_t k = m - 1; k-- > 0;) {
      const f8 re = broadcast(c[2 * k]), im = broadcast(c[2 * k + 1]);
      re0 = re0 * x0 + re;
      im0 = im0 * x0 + im;
      re1 = re1 * x1 + re;
      im1 = im1 * x1 + im;
    }
    store_complex(out, re0, im0);
    store_complex(out + 16, re1, im1);
  }
};

static void polynomial(const float *x, const float *c, std::size_t m, float *out, std::size_t n) {
  run(polynomial_step{c, m}, x, x, out, n);
}

static void complex_polynomial(const float *x, const float *c, std::size_t m, float *out, std::size_t n) {
  run(complex_polynomial_step{c, m}, x, x, out, n);
}
