// Samples times a gain from a table with linear interpolation. SPDX-License-Identifier: MIT

struct lookup_step {
  static constexpr std::size_t block = 8, x_width = 1, y_width = 2, out_width = 2;
  const float *entries;
  f8 start, inverse_step;
  f8 last, last_bits;  // index of the last entry, as a value and as an integer
  inline void operator()(const float *keys, const float *in, float *out) const {
    const f8 t = (load(keys) - start) * inverse_step;
    const f8 k_bits = to_integers(t);
    const f8 k = from_integers(k_bits);  // exact: what is cut off a float is a float
    const f8 above = k >= last;
    const f8 inside = clear(above, k >= broadcast(0.0F));
    int index[8];
    store(reinterpret_cast<float *>(index), (k_bits & inside) | (last_bits & above));  // 0 below the table
    f8 entry[4];
    load_columns(entries, index, entry);
    // Outside the table the slope counts nothing: minus zero changes no value it is added to.
    const f8 nothing = broadcast(-0.0F);
    const f8 f = t - k;
    const f8 gr = select(inside, f * entry[2], nothing) + entry[0];
    const f8 gi = select(inside, f * entry[3], nothing) + entry[1];
    f8 xr, xi;
    load_complex(in, xr, xi);
    store_complex(out, gr * xr - gi * xi, gr * xi + gi * xr);
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
