// SPDX-License-Identifier: MIT
#include "qsrfhs/math/filter.hpp"

#include <algorithm>
#include <cmath>
#include <numbers>

namespace qsrfhs {

Filter Filter::flat_top(std::uint64_t length) {
  Filter window(length, 0.0F);
  const double step = 1.0 / static_cast<double>(length) * (2.0 * std::numbers::pi);
  for (std::uint64_t k = 0; k < length; ++k) {
    const double x = static_cast<double>(k) * step;
    // The order of the additions is fixed: the stored floats must not change by a bit.
    double w = 0.277263158 * std::cos(x + x) + (0.21557895 - 0.41663158 * std::cos(x));
    w = w - 0.083578947 * std::cos(3.0 * x);
    w = w + 0.006947368 * std::cos(4.0 * x);
    window.coefficients()[k] = static_cast<float>(w);
  }
  return window;
}

Filter::Filter(std::uint64_t length, float value) : coefficients_(length) {
  std::fill_n(coefficients_.data(), length, value);
}

}  // namespace qsrfhs
