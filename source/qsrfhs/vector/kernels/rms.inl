// Sums of powers, in single precision. The order of the additions is part of the results. SPDX-License-Identifier: MIT

/// 32 running sums, one for each float of a block of 16 samples.
struct square_sums {
  static constexpr std::size_t registers = 32 / wide::lanes;
  wide sums[registers];
  /// Folded to eight, then added lane by lane.
  inline float total() const {
    float all[32], lanes[8];
    for (std::size_t r = 0; r < registers; ++r) store(all + wide::lanes * r, sums[r]);
    store(lanes, f8::load(all + 24) + f8::load(all + 16) + (f8::load(all + 8) + f8::load(all)));
    float sum = 0;
    for (const float lane : lanes) sum += lane;
    return sum;
  }
};

static inline square_sums no_sums() {
  square_sums none;
  for (wide &sum : none.sums) sum = wide::broadcast(0.0F);
  return none;
}

static inline wide square(wide a) {
  return a * a;
}

static float sum_power(const float *x, std::size_t n) {
  square_sums all = no_sums();
  std::size_t k = 0;
  for (; k + 16 <= n; k += 16, x += 32)
    for (std::size_t r = 0; r < square_sums::registers; ++r)
      all.sums[r] = all.sums[r] + square(wide::load(x + wide::lanes * r));
  float sum = all.total();
  for (; k < n; ++k, x += 2) sum += x[0] * x[0] + x[1] * x[1];
  return sum;
}

/// The sum runs sample by sample in the baseline build and as in sum_power in the others; the peak is the same.
static void sum_power_and_peak(const float *x, std::size_t n, float *sum_out, float *peak_out) {
  square_sums all = no_sums();  // NOLINT(clang-analyzer-deadcode.DeadStores): not used in the baseline build
  float sum = 0;
  wide peaks = wide::broadcast(-__FLT_MAX__);
  std::size_t k = 0;
  for (; k + 16 <= n; k += 16, x += 32) {
    for (std::size_t r = 0; r < square_sums::registers; r += 2) {
      const wide q0 = square(wide::load(x + wide::lanes * r)), q1 = square(wide::load(x + wide::lanes * (r + 1)));
      wide re, im;
      split_in_lanes(q0, q1, re, im);
      const wide powers = re + im;
      peaks = greater_of(powers, peaks);  // the order leaves NaNs out
      if constexpr (peak_sums_in_lanes) {
        all.sums[r] = all.sums[r] + q0;
        all.sums[r + 1] = all.sums[r + 1] + q1;
      } else {
        float lanes[wide::lanes];
        store(lanes, powers);
        for (const float power : lanes) sum += power;
      }
    }
  }
  if constexpr (peak_sums_in_lanes) sum = all.total();
  float lanes[wide::lanes];
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
