// Floats to doubles and back, and a look at those. SPDX-License-Identifier: MIT

static void widen(const float *x, double *out, std::size_t n) {
  constexpr std::size_t lanes = wide_double::lanes;
  std::size_t k = 0;
  for (; k + lanes <= n; k += lanes) store(out + k, wide_double::load(x + k));
  for (; k < n; ++k) out[k] = x[k];
}
static void narrow(const double *x, float *out, std::size_t n) {
  constexpr std::size_t lanes = wide_double::lanes;
  std::size_t k = 0;
  for (; k + lanes <= n; k += lanes) store(out + k, wide_double::load(x + k));
  for (; k < n; ++k) out[k] = static_cast<float>(x[k]);
}

/// 0 times a value that is not finite is not 0. Four sums that do not wait for each other, without an early end.
static bool is_finite(const double *x, std::size_t n) {
  constexpr std::size_t lanes = wide_double::lanes, sums = 4;
  const wide_double zero = wide_double::broadcast(0);
  wide_double sum[sums] = {zero, zero, zero, zero};
  std::size_t k = 0;
  for (; k + sums * lanes <= n; k += sums * lanes)
    for (std::size_t j = 0; j < sums; ++j) sum[j] = sum[j] + zero * wide_double::load(x + k + lanes * j);
  double each[lanes], rest = 0;
  store(each, sum[0] + sum[1] + (sum[2] + sum[3]));
  for (const double s : each) rest += s;
  for (; k < n; ++k) rest += 0 * x[k];
  return rest == 0;
}
