// Samples times a gain from a table with linear interpolation. SPDX-License-Identifier: MIT

struct lookup_step {
  static constexpr std::size_t groups = 8, block = 8 * groups, x_width = 1, y_width = 2, out_width = 2;
  const float *entries;
  f8 start, inverse_step;
  f8 last, last_bits;  // index of the last entry, as a value and as an integer
  template <class Put>
  inline void run(const float *keys, const float *in, float *out) const {
    // In two passes, so that the loads of the second need not wait for the indices.
    int index[block];
    f8 fraction[groups], inside[groups];
    for (std::size_t j = 0; j < groups; ++j) {
      const f8 t = (load(keys + 8 * j) - start) * inverse_step;
      const f8 k_bits = to_integers(t);
      const f8 k = from_integers(k_bits);  // exact: what is cut off a float is a float
      const f8 above = k >= last;
      inside[j] = clear(above, k >= broadcast(0.0F));
      fraction[j] = t - k;
      const f8 entry = (k_bits & inside[j]) | (last_bits & above);  // 0 below the table
      store(reinterpret_cast<float *>(index + 8 * j), entry);
    }
    for (std::size_t j = 0; j < groups; ++j) {
      f8 entry[4], re, im;
      load_columns(entries, index + 8 * j, entry);
      // Outside the table the slope counts nothing: minus zero changes no value it is added to.
      const f8 nothing = broadcast(-0.0F);
      const f8 gain_re = select(inside[j], fraction[j] * entry[2], nothing) + entry[0];
      const f8 gain_im = select(inside[j], fraction[j] * entry[3], nothing) + entry[1];
      load_complex(in + 16 * j, re, im);
      store_complex<Put>(out + 16 * j, gain_re * re - gain_im * im, gain_re * im + gain_im * re);
    }
  }
};

static void lookup(const lookup_table &table, const float *keys, const float *in, float *out, std::size_t n) {
  // An index that is no float is compared as the next float above: no index lies between the two.
  float last = static_cast<float>(table.count - 1);
  if (static_cast<double>(last) < table.count - 1) last = __builtin_bit_cast(float, __builtin_bit_cast(int, last) + 1);
  run(lookup_step{table.entries, broadcast(table.start), broadcast(1.0F / table.step), broadcast(last),
                  broadcast_bits(table.count - 1)},
      keys, in, out, n);
}
