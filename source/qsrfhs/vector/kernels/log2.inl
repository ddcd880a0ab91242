// a * log2(v) + b with a polynomial for the mantissa. Coefficients, order of the operations and the small error that
// they leave (log2 of 1 gives 3.05e-5) are part of the results. SPDX-License-Identifier: MIT

/// Exponent and mantissa are taken from the bits, without the sign: zeros and denormals have exponent -127, infinities
/// and NaNs 128.
static inline f8 log2_8(f8 v) {
  // The exponent field as an integer is the exponent times 2^23; there are no shifts of eight lanes.
  const f8 e = from_integers(v & broadcast_bits(0x7F800000)) * broadcast_bits(0x34000000);
  const f8 m = (v & broadcast_bits(0x007FFFFF)) | broadcast_bits(0x3F800000);
  f8 p = broadcast_bits(0x3D31E3A8) * m - broadcast_bits(0x3ECF4B84);
  p = p * m + broadcast_bits(0x3FCC0592);
  p = p * m - broadcast_bits(0x405F858C);
  p = p * m + broadcast_bits(0x40A18039);
  p = p * m;
  return p - broadcast_bits(0x40325B46) - broadcast(127.0F) + e;
}

/// Real values: a NaN for negative values and NaNs.
static inline f8 log2_of_real_8(f8 v) {
  const f8 not_a_number = broadcast_bits(static_cast<int>(0xFFC00000));  // what a square root of -1 gives
  return select(v >= broadcast(0.0F), log2_8(v), not_a_number);
}

struct log2_step {
  static constexpr std::size_t block = 8, x_width = 1, y_width = 0, out_width = 1;
  f8 a, b;
  inline void operator()(const float *x, const float *, float *out) const {
    store(out, a * log2_of_real_8(load(x)) + b);
  }
};

struct log2_or_infinity_step {
  static constexpr std::size_t block = 8, x_width = 1, y_width = 0, out_width = 1;
  f8 a, b;
  inline void operator()(const float *x, const float *, float *out) const {
    const f8 v = load(x);
    const f8 minus_infinity = broadcast_bits(static_cast<int>(0xFF800000));
    store(out, select(v == broadcast(0.0F), minus_infinity, a * log2_of_real_8(v) + b));
  }
};

struct log2_of_power_step {
  static constexpr std::size_t block = 8, x_width = 2, y_width = 0, out_width = 1;
  f8 a, b;
  inline void operator()(const float *x, const float *, float *out) const { store(out, a * log2_8(power_8(x)) + b); }
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
