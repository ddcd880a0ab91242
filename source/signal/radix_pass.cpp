// SPDX-License-Identifier: MIT
#include "signal/radix_pass.hpp"

#include <cmath>
#include <numbers>

#include "signal/rotation.hpp"

namespace dsp {

template <class Real>
radix_pass<Real>::radix_pass(std::size_t points) : near_(2 * radix * group), far_(2 * (points / radix)) {
  // A line of the caches between rows, which would lie in the same few lines of a cache otherwise.
  constexpr std::size_t gap = 64 / sizeof(bin);
  const std::size_t row = points / radix;
  plan_ = {row, row + gap, nullptr, near_.data(), far_.data()};
  for (std::size_t k = 0; k < radix; ++k) {
    Real *const near = near_.data() + 2 * k * group;
    for (std::size_t n = 0; n < group; ++n) {
      const bin turn(on_circle(-static_cast<double>(k * n) / static_cast<double>(points)));
      near[n] = turn.real();
      near[group + n] = turn.imag();
    }
  }
  // The first columns of groups are whole parts of a row apart, so that the sines of a quarter of the circle have all.
  const std::size_t quarter = row / 4;
  qsrfhs::aligned_buffer<Real> sine(quarter + 1);
  for (std::size_t m = 0; m <= quarter; ++m)
    sine.data()[m] =
        static_cast<Real>(std::sin(2 * std::numbers::pi * static_cast<double>(m) / static_cast<double>(row)));
  for (std::size_t k = 0; k < radix; ++k) {
    std::size_t quarters = 0, m = 0;  // exp(-2 pi j (quarters / 4 + m / row))
    for (std::size_t n = 0; n < row; n += group, m += k) {
      for (; m >= quarter; m -= quarter) ++quarters;
      const Real s = sine.data()[m], c = sine.data()[quarter - m];
      const bin turned[] = {{c, -s}, {-s, -c}, {-c, s}, {s, c}};
      const bin factor = turned[quarters % 4];
      far_.data()[2 * (n + k)] = factor.real();
      far_.data()[2 * (n + k) + 1] = factor.imag();
    }
  }
}

template class radix_pass<float>;
template class radix_pass<double>;

}  // namespace dsp
