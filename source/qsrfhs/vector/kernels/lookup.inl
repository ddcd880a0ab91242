// Samples times a gain from a table with linear interpolation. SPDX-License-Identifier: MIT

/// A table of gains, each with its slope to the next one.
struct gains_with_slopes {
  static constexpr std::size_t width = 4;  // floats from one entry to the next
  static constexpr int highest_entry(int count) { return count - 1; }
  /// One part of the gain: of an entry's four columns those from `part` on, and the way to go from it.
  static inline wide gain(const wide *entry, int part, wide fraction, wide_mask inside, wide_mask) {
    // Outside the table the slope counts nothing: minus zero changes no value it is added to.
    return select(inside, fraction * entry[2 + part], wide::broadcast(-0.0F)) + entry[part];
  }
};

/// A table of gains alone: each is loaded together with its neighbour, the last as the neighbour of the one before.
struct gains_alone {
  static constexpr std::size_t width = 2;
  static constexpr int highest_entry(int count) { return count > 1 ? count - 2 : 0; }
  static inline wide gain(const wide *entry, int part, wide fraction, wide_mask inside, wide_mask above) {
    const wide low = entry[part], high = entry[2 + part];
    return select(inside, fraction * (high - low), wide::broadcast(-0.0F)) + select(above, high, low);
  }
};

template <class Gains>
struct lookup_step {
  static constexpr std::size_t groups = 8, x_width = 1, y_width = 2, out_width = 2;
  const float *entries;
  wide start, inverse_step;
  wide last, highest_entry;  // the last gain's index as a value, and the last entry's as an integer
  template <class Put, std::size_t count>
  inline void run(const float *keys, const float *in, float *out) const {
    // In two passes, so that the loads of the second need not wait for the indices.
    int index[wide::lanes * count];
    wide fraction[count];
    wide_mask inside[count], above[count];
    for (std::size_t j = 0; j < count; ++j) {
      const wide t = (wide::load(keys + wide::lanes * j) - start) * inverse_step;
      const wide k_bits = to_integers(t);
      const wide k = from_integers(k_bits);  // exact: what is cut off a float is a float
      above[j] = k >= last;
      inside[j] = clear(above[j], k >= wide::broadcast(0.0F));
      fraction[j] = t - k;
      const wide entry = (k_bits & inside[j]) | (highest_entry & above[j]);  // 0 below the table
      store(reinterpret_cast<float *>(index + wide::lanes * j), entry);
    }
    for (std::size_t j = 0; j < count; ++j) {
      wide entry[4], re, im;
      load_columns<Gains::width>(entries, index + wide::lanes * j, entry);
      const wide gain_re = Gains::gain(entry, 0, fraction[j], inside[j], above[j]);
      const wide gain_im = Gains::gain(entry, 1, fraction[j], inside[j], above[j]);
      load_complex(in + 2 * wide::lanes * j, re, im);
      store_complex<Put>(out + 2 * wide::lanes * j, gain_re * re - gain_im * im, gain_re * im + gain_im * re);
    }
  }
};

template <class Gains>
static inline void look_up_in(const lookup_table &table, const float *keys, const float *in, float *out,
                              part_of_all n) {
  // An index that is no float is compared as the next float above: no index lies between the two.
  float last = static_cast<float>(table.count - 1);
  if (static_cast<double>(last) < table.count - 1) last = __builtin_bit_cast(float, __builtin_bit_cast(int, last) + 1);
  run(lookup_step<Gains>{table.entries, wide::broadcast(table.start), wide::broadcast(1.0F / table.step),
                         wide::broadcast(last), wide::broadcast_bits(Gains::highest_entry(table.count))},
      keys, in, out, n);
}

static void lookup(const lookup_table &table, const float *keys, const float *in, float *out, part_of_all n) {
  look_up_in<gains_with_slopes>(table, keys, in, out, n);
}

static void lookup_between(const lookup_table &table, const float *keys, const float *in, float *out, part_of_all n) {
  look_up_in<gains_alone>(table, keys, in, out, n);
}
