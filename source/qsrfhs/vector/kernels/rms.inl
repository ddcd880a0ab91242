// Sums of powers, in single precision. The order of the additions is part of the results. SPDX-License-Identifier: MIT

/// 32 running sums, one for each float of a block of 16 samples.
struct square_sums {
  f8 s0, s1, s2, s3;
  inline void add(f8 q0, f8 q1, f8 q2, f8 q3) {
    s0 = s0 + q0;
    s1 = s1 + q1;
    s2 = s2 + q2;
    s3 = s3 + q3;
  }
  /// Folded to eight, then added lane by lane.
  inline float total() const {
    float lanes[8];
    store(lanes, s3 + s2 + (s1 + s0));
    float sum = 0;
    for (const float lane : lanes) sum += lane;
    return sum;
  }
};

static inline square_sums no_sums() {
  const f8 zero = broadcast(0.0F);
  return {zero, zero, zero, zero};
}

static inline f8 square(f8 a) {
  return a * a;
}

static float sum_power(const float *x, std::size_t n) {
  square_sums sums = no_sums();
  std::size_t k = 0;
  for (; k + 16 <= n; k += 16, x += 32)
    sums.add(square(load(x)), square(load(x + 8)), square(load(x + 16)), square(load(x + 24)));
  float sum = sums.total();
  for (; k < n; ++k, x += 2) sum += x[0] * x[0] + x[1] * x[1];
  return sum;
}

/// The sum runs sample by sample in the baseline build and as in sum_power in the AVX build; the peak is the same.
static void sum_power_and_peak(const float *x, std::size_t n, float *sum_out, float *peak_out) {
  square_sums sums = no_sums();  // NOLINT(clang-analyzer-deadcode.DeadStores): used in one of the builds
  float sum = 0;
  f8 peaks = broadcast(-__FLT_MAX__);
  std::size_t k = 0;
  for (; k + 16 <= n; k += 16, x += 32) {
    const f8 q0 = square(load(x)), q1 = square(load(x + 8)), q2 = square(load(x + 16)), q3 = square(load(x + 24));
    f8 re, im;
    split_in_lanes(q0, q1, re, im);
    const f8 p0 = re + im;
    split_in_lanes(q2, q3, re, im);
    const f8 p1 = re + im;
    peaks = greater_of(p1, greater_of(p0, peaks));  // the order leaves NaNs out
    if constexpr (peak_sums_in_lanes) {
      sums.add(q0, q1, q2, q3);
    } else {
      float powers[16];
      store(powers, p0);
      store(powers + 8, p1);
      for (const float power : powers) sum += power;
    }
  }
  if constexpr (peak_sums_in_lanes) sum = sums.total();
  float lanes[8];
  store(lanes, peaks);
  float peak = -__FLT_MAX__;
  for (const float lane : lanes)
    if (lane > peak) peak = lane;
  for (; k < n; ++k, x += 2) {
    const float power = x[0] * x[0] + x[1] * x[1];
    sum += power;
    if (power > peak) peak = power;
  }
  *sum_out = sum;
  *peak_out = peak;
}
