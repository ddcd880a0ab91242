// The bins of the FFT resampler. SPDX-License-Identifier: MIT

static void weigh(const float *x, const float *w, float *out, std::size_t n) {
  std::size_t k = 0;
  for (; k + 4 <= n; k += 4) store(out + 2 * k, load(x + 2 * k) * load(w + 2 * k));
  for (; k < n; ++k) {
    out[2 * k] = x[2 * k] * w[2 * k];
    out[2 * k + 1] = x[2 * k + 1] * w[2 * k + 1];
  }
}

// A pair (re, im) times (c, s): the pair times c, plus the swapped pair times (-s, s).
static inline void weigh_and_rotate_4(const float *x, const float *w, f8 c, f8 s, float *out) {
  const f8 weighed = load(x) * load(w);
  store(out, weighed * c + swap_pairs(weighed) * s);
}

static void weigh_and_rotate(const float *x, const float *w, float c, float s, float *out, std::size_t n) {
  const f8 cosine = broadcast(c), sine = broadcast_pair(-s, s);
  std::size_t k = 0;
  for (; k + 8 <= n; k += 8) {
    weigh_and_rotate_4(x + 2 * k, w + 2 * k, cosine, sine, out + 2 * k);
    weigh_and_rotate_4(x + 2 * k + 8, w + 2 * k + 8, cosine, sine, out + 2 * k + 8);
  }
  for (; k < n; ++k) {
    const float re = x[2 * k] * w[2 * k], im = x[2 * k + 1] * w[2 * k + 1];
    out[2 * k] = re * c + im * -s;
    out[2 * k + 1] = im * c + re * s;
  }
}
