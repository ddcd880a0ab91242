// Filters whose taps lie between the coefficients of a prototype. SPDX-License-Identifier: MIT

/// The first `count` lanes.
static inline f8 lanes_below(int count) {
  static constexpr float places[8] = {1, 2, 3, 4, 5, 6, 7, 8};
  return f8::broadcast(static_cast<float>(count)) >= f8::load(places);
}

/// Sums of taps times samples, eight taps at a time. Of the last samples only `count` are used.
struct real_sum {
  static constexpr std::ptrdiff_t width = 1;
  f8 sum = f8::broadcast(0);
  void add(f8 taps, const float *x) { sum = sum + taps * f8::load(x); }
  void add_some(f8 taps, const float *x, int count) { sum = sum + (lanes_below(count) & (taps * f8::load(x))); }
  void put(float *out) const {
    float sums[2];
    sum_pairs(sum, sums);
    *out = sums[0] + sums[1];
  }
};
struct complex_sum {
  static constexpr std::ptrdiff_t width = 2;
  f8 low = f8::broadcast(0), high = low;
  void add(f8 taps, const float *x) {
    low = low + twice_low(taps) * f8::load(x);
    high = high + twice_high(taps) * f8::load(x + 8);
  }
  void add_some(f8 taps, const float *x, int count) {
    low = low + (lanes_below(2 * count) & (twice_low(taps) * f8::load(x)));
    high = high + (lanes_below(2 * count - 8) & (twice_high(taps) * f8::load(x + 8)));
  }
  void put(float *out) const { sum_pairs(low + high, out); }
};

/// Taps that lie equally far behind the coefficients of a row.
struct taps_of_row {
  const float *row;
  f8 fraction;
  taps_of_row(const tap_rows<float> &rows, const tap_place<float> &place)
      : row(rows.taps + static_cast<std::ptrdiff_t>(place.row) * 2 * rows.length),
        fraction(f8::broadcast(place.fraction)) {}
  f8 next() {
    const f8 taps = f8::load(row) + fraction * f8::load(row + 8);
    row += 16;
    return taps;
  }
};

/// Taps that lie anywhere.
struct taps_at_offsets {
  const float *h, *offset;
  f8 last, whole, fraction;
  taps_at_offsets(const tap_offsets &taps, const tap_place<float> &place)
      : h(taps.prototype),
        offset(taps.offsets),
        last(f8::broadcast(taps.last_pair)),
        whole(f8::broadcast(static_cast<float>(place.row))),
        fraction(f8::broadcast(place.fraction)) {}
  f8 next() {
    const f8 one = f8::broadcast(1), between = f8::load(offset + 8) + fraction;
    const f8 carry = (between >= one) & one;
    const f8 sought = f8::load(offset) + whole + carry;  // whole numbers below 2^24
    const f8 found = smaller_of(sought, last);
    int index[8];
    store(reinterpret_cast<float *>(index), to_integers(found));
    f8 near, far;
    load_pairs(h, index, near, far);
    offset += 16;
    return near + ((between - carry) + (sought - found)) * (far - near);
  }
};

template <class Sum, class Taps, class Source>
static inline void filter_at(const tap_place<float> *places, std::size_t outputs, const Source &source, const float *x,
                             float *out) {
  for (std::size_t k = 0; k < outputs; ++k, out += Sum::width) {
    const tap_place<float> place = places[k];
    const float *in = x + Sum::width * place.first;
    Taps taps(source, place);
    Sum sum;
    int left = place.count;
    for (; left >= 8; left -= 8, in += 8 * Sum::width) sum.add(taps.next(), in);
    if (left > 0) sum.add_some(taps.next(), in, left);
    sum.put(out);
  }
}

static void polyphase(const tap_place<float> *places, std::size_t outputs, const tap_rows<float> &rows, const float *x,
                      float *out) {
  filter_at<real_sum, taps_of_row>(places, outputs, rows, x, out);
}
static void complex_polyphase(const tap_place<float> *places, std::size_t outputs, const tap_rows<float> &rows,
                              const float *x, float *out) {
  filter_at<complex_sum, taps_of_row>(places, outputs, rows, x, out);
}
static void stretched(const tap_place<float> *places, std::size_t outputs, const tap_offsets &taps, const float *x,
                      float *out) {
  filter_at<real_sum, taps_at_offsets>(places, outputs, taps, x, out);
}
static void complex_stretched(const tap_place<float> *places, std::size_t outputs, const tap_offsets &taps,
                              const float *x, float *out) {
  filter_at<complex_sum, taps_at_offsets>(places, outputs, taps, x, out);
}
