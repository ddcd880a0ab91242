// The bins of the FFT resampler. SPDX-License-Identifier: MIT

/// Floats, one by one.
struct weigh_step {
  static constexpr std::size_t groups = 1, x_width = 1, y_width = 1, out_width = 1;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *w, float *out) const {
    Put::put(out, wide::load(x) * wide::load(w));
  }
};

/// A pair (re, im) times (c, s): the pair times c, plus the swapped pair times (-s, s).
struct weigh_and_rotate_step {
  static constexpr std::size_t groups = 1, x_width = 2, y_width = 2, out_width = 2;
  wide c, s;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *w, float *out) const {
    for (std::size_t at = 0; at < 2 * wide::lanes; at += wide::lanes) {
      const wide weighed = wide::load(x + at) * wide::load(w + at);
      Put::put(out + at, multiply_add(weighed, c, swap_pairs(weighed) * s));
    }
  }
};

static void weigh(const float *x, const float *w, float *out, std::size_t n) {
  go_over<into_caches>(weigh_step{}, x, w, out, 2 * n);
}

static void weigh_and_rotate(const float *x, const float *w, float c, float s, float *out, std::size_t n) {
  go_over<into_caches>(weigh_and_rotate_step{wide::broadcast(c), wide::broadcast_pair(-s, s)}, x, w, out, n);
}
