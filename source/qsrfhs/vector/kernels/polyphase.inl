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

/// Coefficients in front of taps, and their slopes to the next, from the prototype or out of rows of them.
struct coefficients_sought {
  const float *h;
  coefficients_sought(const tap_offsets &taps, const tap_place<float> & /*place*/) : h(taps.prototype) {}
  void get(f8 found, f8 /*carries*/, f8 &near, f8 &slope) const {
    int index[8];
    store(reinterpret_cast<float *>(index), to_integers(found));
    f8 far;
    load_pairs(h, index, near, far);
    slope = far - near;
  }
};
struct coefficients_in_rows {
  const float *row, *next;
  coefficients_in_rows(const tap_offsets &taps, const tap_place<float> &place)
      : row(taps.at_rows.taps + static_cast<std::ptrdiff_t>(place.row) * 2 * taps.at_rows.length),
        next(row + 2 * static_cast<std::ptrdiff_t>(taps.at_rows.length)) {}
  void get(f8 /*found*/, f8 carries, f8 &near, f8 &slope) {
    near = select(carries, f8::load(next), f8::load(row));
    slope = select(carries, f8::load(next + 8), f8::load(row + 8));
    row += 16;
    next += 16;
  }
};

/// Taps that lie anywhere.
template <class Coefficients>
struct taps_at_offsets {
  Coefficients coefficients;
  const float *offset;
  f8 last, whole, fraction;
  taps_at_offsets(const tap_offsets &taps, const tap_place<float> &place)
      : coefficients(taps, place),
        offset(taps.offsets),
        last(f8::broadcast(taps.last_pair)),
        whole(f8::broadcast(static_cast<float>(place.row))),
        fraction(f8::broadcast(place.fraction)) {}
  f8 next() {
    const f8 one = f8::broadcast(1), between = f8::load(offset + 8) + fraction;
    const f8 carries = between >= one, carry = carries & one;
    const f8 sought = f8::load(offset) + whole + carry;  // whole numbers below 2^24
    const f8 found = smaller_of(sought, last);
    f8 near, slope;
    coefficients.get(found, carries, near, slope);
    offset += 16;
    return near + ((between - carry) + (sought - found)) * slope;
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
template <class Sum>
static inline void filter_at_offsets(const tap_place<float> *places, std::size_t outputs, const tap_offsets &taps,
                                     const float *x, float *out) {
  if (taps.at_rows.taps)
    filter_at<Sum, taps_at_offsets<coefficients_in_rows>>(places, outputs, taps, x, out);
  else
    filter_at<Sum, taps_at_offsets<coefficients_sought>>(places, outputs, taps, x, out);
}
static void stretched(const tap_place<float> *places, std::size_t outputs, const tap_offsets &taps, const float *x,
                      float *out) {
  filter_at_offsets<real_sum>(places, outputs, taps, x, out);
}
static void complex_stretched(const tap_place<float> *places, std::size_t outputs, const tap_offsets &taps,
                              const float *x, float *out) {
  filter_at_offsets<complex_sum>(places, outputs, taps, x, out);
}
