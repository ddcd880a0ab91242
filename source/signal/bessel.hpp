// SPDX-License-Identifier: MIT
#pragma once

namespace dsp {

/// Modified Bessel function of order 0, by its power series: all terms are positive, so that nothing cancels. Infinite
/// above about 713.
inline double bessel_i0(double x) noexcept {
  const double quarter = x * x / 4;
  double sum = 1, term = 1;
  for (double k = 1; term > sum * 1e-17; ++k) {
    term *= quarter / (k * k);
    sum += term;
  }
  return sum;
}

}  // namespace dsp
