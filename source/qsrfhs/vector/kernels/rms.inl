// Sums of powers, in single precision. The order of the additions is part of the results. SPDX-License-Identifier: MIT

/// 32 running sums, one for each float of a block of 16 samples.
template <class Lanes>
struct square_sums {
  static constexpr std::size_t registers = 32 / Lanes::lanes;
  Lanes sums[registers];
  square_sums() {
    for (Lanes &sum : sums) sum = Lanes::broadcast(0.0F);
  }
  /// Folded to eight, then added lane by lane.
  [[nodiscard]] float total() const {
    float lanes[8];
    if constexpr (registers == 4)
      store(lanes, sums[3] + sums[2] + (sums[1] + sums[0]));
    else
      store(lanes, add_halves(sums[1]) + add_halves(sums[0]));
    float sum = 0;
    for (const float lane : lanes) sum += lane;
    return sum;
  }
};

template <class Lanes>
static inline Lanes square(Lanes a) {
  return a * a;
}

/// In eight lanes: additions of sixteen make each sum wait longer for the one before than they save.
static float sum_power(const float *x, std::size_t n) {
  square_sums<f8> all;
  std::size_t k = 0;
  for (; k + 16 <= n; k += 16, x += 32)
    for (std::size_t r = 0; r < 4; ++r) all.sums[r] = all.sums[r] + square(f8::load(x + 8 * r));
  float sum = all.total();
  for (; k < n; ++k, x += 2) sum += x[0] * x[0] + x[1] * x[1];
  return sum;
}

/// The sum runs sample by sample in the baseline build and as in sum_power in the others; the peak is the same.
static void sum_power_and_peak(const float *x, std::size_t n, float *sum_out, float *peak_out) {
  square_sums<wide> all;  // NOLINT(clang-analyzer-deadcode.DeadStores): not used in the baseline build
  float sum = 0;
  wide peaks = wide::broadcast(-__FLT_MAX__);
  std::size_t k = 0;
  for (; k + 16 <= n; k += 16, x += 32) {
    for (std::size_t r = 0; r < all.registers; r += 2) {
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
