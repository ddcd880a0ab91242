// a * log2(v) + b with a polynomial for the mantissa. Coefficients, order of the operations and the small error that
// they leave (log2 of 1 gives 3.05e-5) are part of the results. SPDX-License-Identifier: MIT

/// Groups that run side by side, step by step: one alone would wait for each of its operations.
static constexpr std::size_t log2_groups = 4;

template <std::size_t groups>
struct log2_lanes {
  wide group[groups];
};

/// p * m + c, with the bits of c, each operation rounded by itself.
template <std::size_t groups>
static inline void scale_and_add(log2_lanes<groups> &p, const log2_lanes<groups> &m, int c) {
  for (std::size_t j = 0; j < groups; ++j) p.group[j] = p.group[j] * m.group[j] + wide::broadcast_bits(c);
}

/// Exponent and mantissa are taken from the bits, without the sign: zeros and denormals have exponent -127, infinities
/// and NaNs 128.
template <std::size_t groups>
static inline log2_lanes<groups> log2_of(const log2_lanes<groups> &v) {
  log2_lanes<groups> m, e, p;
  for (std::size_t j = 0; j < groups; ++j) {
    m.group[j] = (v.group[j] & wide::broadcast_bits(0x007FFFFF)) | wide::broadcast_bits(0x3F800000);
    // The exponent field as an integer is the exponent times 2^23; AVX has no shifts of eight lanes.
    e.group[j] = from_integers(v.group[j] & wide::broadcast_bits(0x7F800000)) * wide::broadcast_bits(0x34000000);
    p.group[j] = wide::broadcast_bits(0x3D31E3A8);
  }
  constexpr int minus = static_cast<int>(0x80000000);  // adding the negative is subtracting
  scale_and_add(p, m, minus | 0x3ECF4B84);
  scale_and_add(p, m, 0x3FCC0592);
  scale_and_add(p, m, minus | 0x405F858C);
  scale_and_add(p, m, 0x40A18039);
  scale_and_add(p, m, minus | 0x40325B46);
  for (std::size_t j = 0; j < groups; ++j) p.group[j] = p.group[j] - wide::broadcast(127.0F) + e.group[j];
  return p;
}

template <std::size_t groups>
static inline log2_lanes<groups> load_values(const float *x) {
  log2_lanes<groups> v;
  for (std::size_t j = 0; j < groups; ++j) v.group[j] = wide::load(x + wide::lanes * j);
  return v;
}

/// a * l + b for the logarithms l of real values v: a NaN for those that are negative or NaN.
template <std::size_t groups>
static inline log2_lanes<groups> scale_real(const log2_lanes<groups> &v, log2_lanes<groups> l, wide a, wide b) {
  const wide not_a_number = wide::broadcast_bits(static_cast<int>(0xFFC00000));  // what a square root of -1 gives
  for (std::size_t j = 0; j < groups; ++j)
    l.group[j] = a * select(v.group[j] >= wide::broadcast(0.0F), l.group[j], not_a_number) + b;
  return l;
}

template <class Put, std::size_t groups>
static inline void store_results(const log2_lanes<groups> &l, float *out) {
  for (std::size_t j = 0; j < groups; ++j) Put::put(out + wide::lanes * j, l.group[j]);
}

struct log2_step {
  static constexpr std::size_t groups = log2_groups, x_width = 1, y_width = 0, out_width = 1;
  wide a, b;
  template <class Put, std::size_t count>
  inline void run(const float *x, const float *, float *out) const {
    const auto v = load_values<count>(x);
    store_results<Put>(scale_real(v, log2_of(v), a, b), out);
  }
};

struct log2_or_infinity_step {
  static constexpr std::size_t groups = log2_groups, x_width = 1, y_width = 0, out_width = 1;
  wide a, b;
  template <class Put, std::size_t count>
  inline void run(const float *x, const float *, float *out) const {
    const auto v = load_values<count>(x);
    auto l = scale_real(v, log2_of(v), a, b);
    const wide minus_infinity = wide::broadcast_bits(static_cast<int>(0xFF800000));
    for (std::size_t j = 0; j < count; ++j)
      l.group[j] = select(v.group[j] == wide::broadcast(0.0F), minus_infinity, l.group[j]);
    store_results<Put>(l, out);
  }
};

struct log2_of_power_step {
  static constexpr std::size_t groups = log2_groups, x_width = 2, y_width = 0, out_width = 1;
  wide a, b;
  template <class Put, std::size_t count>
  inline void run(const float *x, const float *, float *out) const {
    log2_lanes<count> v;
    for (std::size_t j = 0; j < count; ++j) v.group[j] = power_of(x + 2 * wide::lanes * j);
    auto l = log2_of(v);
    for (wide &group : l.group) group = a * group + b;
    store_results<Put>(l, out);
  }
};

static void log2_scaled(const float *x, float a, float b, float *out, std::size_t n) {
  run(log2_step{wide::broadcast(a), wide::broadcast(b)}, x, x, out, n);
}

static void log2_scaled_or_infinity(const float *x, float a, float b, float *out, std::size_t n) {
  run(log2_or_infinity_step{wide::broadcast(a), wide::broadcast(b)}, x, x, out, n);
}

static void log2_scaled_power(const float *x, float a, float b, float *out, std::size_t n) {
  run(log2_of_power_step{wide::broadcast(a), wide::broadcast(b)}, x, x, out, n);
}
