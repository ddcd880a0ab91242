// Dot products of samples with the taps of a filter. SPDX-License-Identifier: MIT

/// Eight floats of real samples, or four complex ones, with their taps.
struct real_samples {
  static constexpr std::size_t width = 1;
  static f8 taps(const float *h) { return load(h); }
};
struct complex_samples {
  static constexpr std::size_t width = 2;
  static f8 taps(const float *h) { return load_twice(h); }
};

/// The first `count` lanes.
static inline f8 lanes_below(std::size_t count) {
  static constexpr float places[8] = {1, 2, 3, 4, 5, 6, 7, 8};
  return broadcast(static_cast<float>(static_cast<int>(count))) >= load(places);
}

/// Sums over n samples in eight lanes, the last eight floats cut to those that count. `between` is false: h0 alone.
template <class Samples, bool between>
static inline f8 lane_sums(const float *h0, const float *h1, float fraction, const float *x, std::size_t n) {
  constexpr std::size_t per_lanes = 8 / Samples::width;
  f8 a0 = broadcast(0), a1 = a0, b0 = a0, b1 = a0;
  for (; n >= 2 * per_lanes; n -= 2 * per_lanes, x += 16, h0 += 2 * per_lanes) {
    const f8 x0 = load(x), x1 = load(x + 8);
    a0 = a0 + x0 * Samples::taps(h0);
    a1 = a1 + x1 * Samples::taps(h0 + per_lanes);
    if constexpr (between) {
      b0 = b0 + x0 * Samples::taps(h1);
      b1 = b1 + x1 * Samples::taps(h1 + per_lanes);
      h1 += 2 * per_lanes;
    }
  }
  for (std::size_t done = 0; done < n; done += per_lanes) {
    const f8 mask = lanes_below((n - done) * Samples::width), x0 = load(x + done * Samples::width);
    a0 = a0 + (mask & (x0 * Samples::taps(h0 + done)));
    if constexpr (between) b0 = b0 + (mask & (x0 * Samples::taps(h1 + done)));
  }
  if constexpr (!between) return a0 + a1;
  return (a0 + a1) * broadcast(1 - fraction) + (b0 + b1) * broadcast(fraction);
}

static float dot(const float *h, const float *x, std::size_t n) {
  float sums[2];
  sum_pairs(lane_sums<real_samples, false>(h, h, 0, x, n), sums);
  return sums[0] + sums[1];
}

static float dot_between(const float *h0, const float *h1, float fraction, const float *x, std::size_t n) {
  float sums[2];
  sum_pairs(lane_sums<real_samples, true>(h0, h1, fraction, x, n), sums);
  return sums[0] + sums[1];
}

static void complex_dot(const float *h, const float *x, std::size_t n, float *sum) {
  sum_pairs(lane_sums<complex_samples, false>(h, h, 0, x, n), sum);
}

static void complex_dot_between(const float *h0, const float *h1, float fraction, const float *x, std::size_t n,
                                float *sum) {
  sum_pairs(lane_sums<complex_samples, true>(h0, h1, fraction, x, n), sum);
}
