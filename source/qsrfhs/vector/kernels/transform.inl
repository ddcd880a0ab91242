// The loops around the toolkit's transforms. SPDX-License-Identifier: MIT

/// Stores that straddle cache lines cost most here, so loops begin one by one until their output lies on a boundary.
static inline bool is_aligned(const float *p) {
  return reinterpret_cast<std::size_t>(p) % sizeof(wide) == 0;
}

static inline void reverse_conjugate_1(const float *x, float *out) {
  out[0] = x[0];
  out[1] = -x[1];
}

static void reverse_conjugate(const float *x, float *out, std::size_t n) {
  std::size_t k = 0;
  for (; k < n && !is_aligned(out + 2 * k); ++k) reverse_conjugate_1(x + 2 * (n - 1 - k), out + 2 * k);
  constexpr std::size_t pairs = wide::lanes / 2;
  for (; k + pairs <= n; k += pairs) store(out + 2 * k, conjugate(reverse_pairs(wide::load(x + 2 * (n - k - pairs)))));
  for (; k < n; ++k) reverse_conjugate_1(x + 2 * (n - 1 - k), out + 2 * k);
}

static inline void scaled_power_1(const float *x, float *out, float *mirror, double factor) {
  const float power = x[0] * x[0] + x[1] * x[1];
  *out = static_cast<float>(static_cast<double>(power) * factor);
  if (mirror) *mirror = *out;
}

static void scaled_power(const float *x, float *out, float *mirror, double factor, std::size_t n) {
  // A factor that is a power of two gives the same bits in single precision, at half the work.
  const auto narrow = static_cast<float>(factor);
  unsigned bits = 0;
  __builtin_memcpy(&bits, &narrow, sizeof bits);
  const bool exact = narrow == factor && (bits & 0x007fffffU) == 0;
  const wide factors = wide::broadcast(narrow);
  float *const last = mirror ? mirror + n - 1 : nullptr;
  std::size_t k = 0;
  for (; k < n && !is_aligned(out + k); ++k) scaled_power_1(x + 2 * k, out + k, last ? last - k : nullptr, factor);
  for (; k + wide::lanes <= n; k += wide::lanes) {
    const wide power = power_of(x + 2 * k);
    const wide scaled = exact ? power * factors : multiply_in_double(power, factor);
    store(out + k, scaled);
    if (last) store(last - k - (wide::lanes - 1), reverse(scaled));
  }
  for (; k < n; ++k) scaled_power_1(x + 2 * k, out + k, last ? last - k : nullptr, factor);
}

struct multiply_step {
  static constexpr std::size_t groups = 1, x_width = 2, y_width = 2, out_width = 2;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *y, float *out) const {
    for (std::size_t at = 0; at < 2 * wide::lanes; at += wide::lanes)
      Put::put(out + at, multiply_pairs(wide::load(x + at), wide::load(y + at)));
  }
};

static void multiply(float *a, const float *b, std::size_t n) {
  go_over<into_caches>(multiply_step{}, a, b, a, n);
}
