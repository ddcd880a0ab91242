// a * log2(v) + b with a polynomial for the mantissa. Coefficients, order of the operations and the small error that
// they leave (log2 of 1 gives 3.05e-5) are part of the results. SPDX-License-Identifier: MIT

/// Groups of eight that run side by side, step by step: one alone would wait for each of its operations.
static constexpr std::size_t log2_groups = 4;

struct log2_lanes {
  f8 group[log2_groups];
};

/// p * m + c, with the bits of c.
static inline log2_lanes multiply_add(log2_lanes p, const log2_lanes &m, int c) {
  for (std::size_t j = 0; j < log2_groups; ++j) p.group[j] = p.group[j] * m.group[j] + broadcast_bits(c);
  return p;
}

/// Exponent and mantissa are taken from the bits, without the sign: zeros and denormals have exponent -127, infinities
/// and NaNs 128.
static inline log2_lanes log2_of(const log2_lanes &v) {
  log2_lanes m, e, p;
  for (std::size_t j = 0; j < log2_groups; ++j) {
    m.group[j] = (v.group[j] & broadcast_bits(0x007FFFFF)) | broadcast_bits(0x3F800000);
    // The exponent field as an integer is the exponent times 2^23; there are no shifts of eight lanes.
    e.group[j] = from_integers(v.group[j] & broadcast_bits(0x7F800000)) * broadcast_bits(0x34000000);
    p.group[j] = broadcast_bits(0x3D31E3A8);
  }
  constexpr int minus = static_cast<int>(0x80000000);  // adding the negative is subtracting
  p = multiply_add(p, m, minus | 0x3ECF4B84);
  p = multiply_add(p, m, 0x3FCC0592);
  p = multiply_add(p, m, minus | 0x405F858C);
  p = multiply_add(p, m, 0x40A18039);
  p = multiply_add(p, m, minus | 0x40325B46);
  for (std::size_t j = 0; j < log2_groups; ++j) p.group[j] = p.group[j] - broadcast(127.0F) + e.group[j];
  return p;
}

static inline log2_lanes load_values(const float *x) {
  log2_lanes v;
  for (std::size_t j = 0; j < log2_groups; ++j) v.group[j] = load(x + 8 * j);
  return v;
}

/// a * l + b for the logarithms l of real values v: a NaN for those that are negative or NaN.
static inline log2_lanes scale_real(const log2_lanes &v, log2_lanes l, f8 a, f8 b) {
  const f8 not_a_number = broadcast_bits(static_cast<int>(0xFFC00000));  // what a square root of -1 gives
  for (std::size_t j = 0; j < log2_groups; ++j)
    l.group[j] = a * select(v.group[j] >= broadcast(0.0F), l.group[j], not_a_number) + b;
  return l;
}

template <class Put>
static inline void store_results(const log2_lanes &l, float *out) {
  for (std::size_t j = 0; j < log2_groups; ++j) Put::put(out + 8 * j, l.group[j]);
}

struct log2_step {
  static constexpr std::size_t block = 8 * log2_groups, x_width = 1, y_width = 0, out_width = 1;
  f8 a, b;
  template <class Put>
  inline void run(const float *x, const float *, float *out) const {
    const log2_lanes v = load_values(x);
    store_results<Put>(scale_real(v, log2_of(v), a, b), out);
  }
};

struct log2_or_infinity_step {
  static constexpr std::size_t block = 8 * log2_groups, x_width = 1, y_width = 0, out_width = 1;
  f8 a, b;
  template <class Put>
  inline void run(const float *x, const float *, float *out) const {
    const log2_lanes v = load_values(x);
    log2_lanes l = scale_real(v, log2_of(v), a, b);
    const f8 minus_infinity = broadcast_bits(static_cast<int>(0xFF800000));
    for (std::size_t j = 0; j < log2_groups; ++j)
      l.group[j] = select(v.group[j] == broadcast(0.0F), minus_infinity, l.group[j]);
    store_results<Put>(l, out);
  }
};

struct log2_of_power_step {
  static constexpr std::size_t block = 8 * log2_groups, x_width = 2, y_width = 0, out_width = 1;
  f8 a, b;
  template <class Put>
  inline void run(const float *x, const float *, float *out) const {
    log2_lanes v;
    for (std::size_t j = 0; j < log2_groups; ++j) v.group[j] = power_8(x + 16 * j);
    log2_lanes l = log2_of(v);
    for (f8 &group : l.group) group = a * group + b;
    store_results<Put>(l, out);
  }
};

static void log2_scaled(const float *x, float a, float b, float *out, std::size_t n) {
  run(log2_step{broadcast(a), broadcast(b)}, x, x, out, n);
}

static void log2_scaled_or_infinity(const float *x, float a, float b, float *out, std::size_t n) {
  run(log2_or_infinity_step{broadcast(a), broadcast(b)}, x, x, out, n);
}

static void log2_scaled_power(const float *x, float a, float b, float *out, std::size_t n) {
  run(log2_of_power_step{broadcast(a), broadcast(b)}, x, x, out, n);
}
