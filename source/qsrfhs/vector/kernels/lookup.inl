// Samples times a gain from a table with linear interpolation. SPDX-License-Identifier: MIT

struct lookup_step {
  static constexpr std::size_t groups = 8, x_width = 1, y_width = 2, out_width = 2;
  const float *entries;
  wide start, inverse_step;
  wide last, last_bits;  // index of the last entry, as a value and as an integer
  template <class Put, std::size_t count>
  inline void run(const float *keys, const float *in, float *out) const {
    // In two passes, so that the loads of the second need not wait for the indices.
    int index[wide::lanes * count];
    wide fraction[count];
    wide_mask inside[count];
    for (std::size_t j = 0; j < count; ++j) {
      const wide t = (wide::load(keys + wide::lanes * j) - start) * inverse_step;
      const wide k_bits = to_integers(t);
      const wide k = from_integers(k_bits);  // exact: what is cut off a float is a float
      const wide_mask above = k >= last;
      inside[j] = clear(above, k >= wide::broadcast(0.0F));
      fraction[j] = t - k;
      const wide entry = (k_bits & inside[j]) | (last_bits & above);  // 0 below the table
      store(reinterpret_cast<float *>(index + wide::lanes * j), entry);
    }
    for (std::size_t j = 0; j < count; ++j) {
      wide entry[4], re, im;
      load_columns(entries, index + wide::lanes * j, entry);
      // Outside the table the slope counts nothing: minus zero changes no value it is added to.
      const wide nothing = wide::broadcast(-0.0F);
      const wide gain_re = select(inside[j], fraction[j] * entry[2], nothing) + entry[0];
      const wide gain_im = select(inside[j], fraction[j] * entry[3], nothing) + entry[1];
      load_complex(in + 2 * wide::lanes * j, re, im);
      store_complex<Put>(out + 2 * wide::lanes * j, gain_re * re - gain_im * im, gain_re * im + gain_im * re);
    }
  }
};

static void lookup(const lookup_table &table, const float *keys, const float *in, float *out, std::size_t n) {
  // An index that is no float is compared as the next float above: no index lies between the two.
  float last = static_cast<float>(table.count - 1);
  if (static_cast<double>(last) < table.count - 1) last = __builtin_bit_cast(float, __builtin_bit_cast(int, last) + 1);
  run(lookup_step{table.entries, wide::broadcast(table.start), wide::broadcast(1.0F / table.step),
                  wide::broadcast(last), wide::broadcast_bits(table.count - 1)},
      keys, in, out, n);
}
