// The loops around the toolkit's transforms. SPDX-License-Identifier: MIT

/// Stores that straddle cache lines cost most here, so loops begin one by one until their output lies on a boundary.
static inline bool is_aligned(const float *p) {
  return reinterpret_cast<unsigned long>(p) % 32 == 0;
}

static inline void reverse_conjugate_1(const float *x, float *out) {
  out[0] = x[0];
  out[1] = -x[1];
}

static void reverse_conjugate(const float *x, float *out, std::size_t n) {
  std::size_t k = 0;
  for (; k < n && !is_aligned(out + 2 * k); ++k) reverse_conjugate_1(x + 2 * (n - 1 - k), out + 2 * k);
  for (; k + 4 <= n; k += 4) store(out + 2 * k, conjugate(reverse_pairs(load(x + 2 * (n - k - 4)))));
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
  const f8 factors = broadcast(narrow);
  float *const last = mirror ? mirror + n - 1 : nullptr;
  std::size_t k = 0;
  for (; k < n && !is_aligned(out + k); ++k) scaled_power_1(x + 2 * k, out + k, last ? last - k : nullptr, factor);
  for (; k + 8 <= n; k += 8) {
    f8 re, im;
    load_complex(x + 2 * k, re, im);
    const f8 power = re * re + im * im;
    const f8 scaled = exact ? power * factors : multiply_in_double(power, factor);
    store(out + k, scaled);
    if (last) store(last - k - 7, reverse(scaled));
  }
  for (; k < n; ++k) scaled_power_1(x + 2 * k, out + k, last ? last - k : nullptr, factor);
}

static void multiply(float *a, const float *b, std::size_t n) {
  std::size_t k = 0;
  for (; k + 4 <= n; k += 4) store(a + 2 * k, multiply_pairs(load(a + 2 * k), load(b + 2 * k)));
  for (; k < n; ++k) {
    const float re = a[2 * k], im = a[2 * k + 1], other_re = b[2 * k], other_im = b[2 * k + 1];
    a[2 * k] = re * other_re - im * other_im;
    a[2 * k + 1] = im * other_re + re * other_im;
  }
}
