// Filters whose taps are cubic polynomials of the place between two samples. SPDX-License-Identifier: MIT

/// A register of taps at `at`: in front of it stand their coefficients, the highest power first.
template <class Lanes, class Real>
static inline Lanes cubic(const Real *c, Lanes at) {
  Lanes sum = Lanes::load(c);
  for (std::size_t power = 1; power < 4; ++power) sum = multiply_add(sum, at, Lanes::load(c + Lanes::lanes * power));
  return sum;
}

static inline void sum_pairs(d4 a, double *sums) {
  double all[4];
  store(all, a);
  sums[0] = all[0] + all[2];
  sums[1] = all[1] + all[3];
}

template <class Lanes, class Real>
static inline void interpolate_by(const sample_place<Real> *places, std::size_t outputs, const cubic_taps<Real> &taps,
                                  std::size_t width, const Real *x, Real *out) {
  for (std::size_t k = 0; k < outputs; ++k) {
    const Lanes at = Lanes::broadcast(places[k].offset);
    const Real *c = taps.coefficients + 4 * taps.length * places[k].row;
    const Real *in = x + width * places[k].first;
    Lanes sum = cubic<Lanes>(c, at) * Lanes::load(in);
    for (std::size_t j = Lanes::lanes; j < taps.length; j += Lanes::lanes)
      sum = multiply_add(cubic<Lanes>(c + 4 * j, at), Lanes::load(in + j), sum);
    Real sums[2];
    sum_pairs(sum, sums);
    if (width == 2) {
      *out++ = sums[0];
      *out++ = sums[1];
    } else {
      *out++ = sums[0] + sums[1];
    }
  }
}

static void interpolate(const sample_place<float> *places, std::size_t outputs, const cubic_taps<float> &taps,
                        std::size_t width, const float *x, float *out) {
  interpolate_by<f8>(places, outputs, taps, width, x, out);
}
static void interpolate_double(const sample_place<double> *places, std::size_t outputs, const cubic_taps<double> &taps,
                               std::size_t width, const double *x, double *out) {
  interpolate_by<d4>(places, outputs, taps, width, x, out);
}
