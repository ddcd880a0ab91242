// The loops around the toolkit's transforms. SPDX-License-Identifier: MIT

// Stores that straddle cache lines cost most here, so groups begin on boundaries of their output.

/// Values between the boundary in front of p and p.
static inline std::size_t behind_boundary(const float *p) {
  return reinterpret_cast<std::size_t>(p) % sizeof(wide) / sizeof(float);
}

/// Calls put(k) for groups that begin at k, on a boundary of `out` but for the first and the last one. These overlap with
/// their neighbours: what is written twice is the same. At least a group.
template <class Put>
static inline void put_groups(const float *out, std::size_t k, std::size_t end, const Put &put) {
  put(k);
  k += wide::lanes - behind_boundary(out + k);
  for (; k + wide::lanes <= end; k += wide::lanes) put(k);
  if (k < end) put(end - wide::lanes);
}

static inline void reverse_conjugate_1(const float *x, float *out) {
  out[0] = x[0];
  out[1] = -x[1];
}

static void reverse_conjugate(const float *x, float *out, std::size_t n) {
  std::size_t k = 0;
  for (; k < n && behind_boundary(out + 2 * k) != 0; ++k) reverse_conjugate_1(x + 2 * (n - 1 - k), out + 2 * k);
  constexpr std::size_t pairs = wide::lanes / 2;
  for (; k + pairs <= n; k += pairs) store(out + 2 * k, conjugate(reverse_pairs(wide::load(x + 2 * (n - k - pairs)))));
  for (; k < n; ++k) reverse_conjugate_1(x + 2 * (n - 1 - k), out + 2 * k);
}

/// The factor of powers, which is applied in double precision. One that is a power of two gives the same bits in single
/// precision, at half the work.
struct power_factor {
  wide narrow;
  double factor;
  bool exact;
  explicit power_factor(double of) : narrow(wide::broadcast(static_cast<float>(of))), factor(of) {
    const auto rounded = static_cast<float>(of);
    unsigned bits = 0;
    __builtin_memcpy(&bits, &rounded, sizeof bits);
    exact = rounded == of && (bits & 0x007fffffU) == 0;
  }
  [[nodiscard]] float of_bin(const float *x) const {
    return static_cast<float>(static_cast<double>(x[0] * x[0] + x[1] * x[1]) * factor);
  }
  [[nodiscard]] wide of_bins(const float *x) const {
    const wide power = power_of(x);
    return exact ? power * narrow : multiply_in_double(power, factor);
  }
};

/// Powers of bins k to `end` in reverse: that of bin k goes to end_of[-1 - k]. Where it ended: on a boundary, or behind
/// the last bin of all.
static inline std::size_t mirrored_up_to(const power_factor &of, const float *x, float *end_of, std::size_t k,
                                         std::size_t end, bool is_last) {
  const auto put = [&](std::size_t at) { store(end_of - at - wide::lanes, reverse(of.of_bins(x + 2 * at))); };
  if (const std::size_t odd = behind_boundary(end_of - k)) {
    put(k);
    k += odd;
  }
  for (; k + wide::lanes <= end; k += wide::lanes) put(k);
  if (is_last && k < end) {
    put(end - wide::lanes);
    k = end;
  }
  return k;
}

static void scaled_power(const float *x, float *out, float *mirror, double factor, std::size_t n) {
  // From here on two lines of the second-level cache for each store into the mirror take longer than to compute powers
  // twice, piece by piece, each time on boundaries of where they go.
  constexpr std::size_t leaves_first_cache = 4096, piece = 1024;
  const power_factor of(factor);
  if (n < wide::lanes) {
    for (std::size_t k = 0; k < n; ++k) {
      out[k] = of.of_bin(x + 2 * k);
      if (mirror) mirror[n - 1 - k] = out[k];
    }
    return;
  }
  const auto put = [&](std::size_t k) { store(out + k, of.of_bins(x + 2 * k)); };
  if (!mirror) return put_groups(out, 0, n, put);
  if (n < leaves_first_cache)
    return put_groups(out, 0, n, [&](std::size_t k) {
      const wide powers = of.of_bins(x + 2 * k);
      store(out + k, powers);
      store(mirror + n - k - wide::lanes, reverse(powers));
    });
  for (std::size_t begin = 0, mirrored = 0; begin < n;) {
    const bool is_last = n - begin < 2 * piece;
    const std::size_t end = is_last ? n : begin + piece - behind_boundary(out + begin);
    put_groups(out, begin, end, put);
    mirrored = mirrored_up_to(of, x, mirror + n, mirrored, end, is_last);
    begin = end;
  }
}

struct multiply_step {
  static constexpr std::size_t groups = 1, x_width = 2, y_width = 2, out_width = 2;
  template <class Put, std::size_t>
  inline void run(const float *x, const float *y, float *out) const {
    for (std::size_t at = 0; at < 2 * wide::lanes; at += wide::lanes)
      Put::put(out + at, multiply_pairs(wide::load(x + at), wide::load(y + at)));
  }
};

static void multiply(const float *a, const float *b, float *out, std::size_t n) {
  go_over<into_caches>(multiply_step{}, a, b, out, n);
}
