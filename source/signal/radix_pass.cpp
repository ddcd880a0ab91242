// SPDX-License-Identifier: MIT
#include "signal/radix_pass.hpp"

#include "signal/rotation.hpp"

namespace dsp {

template <class Real>
radix_pass<Real>::radix_pass(std::size_t points) : near_(2 * radix * group), far_(2 * (points / radix)) {
  // A line of the caches between rows, which would lie in the same few lines of a cache otherwise.
  constexpr std::size_t gap = 64 / sizeof(bin);
  const std::size_t row = points / radix;
  plan_ = {row, row + gap, nullptr, near_.data(), far_.data()};
  const auto factor = [&](std::size_t k, std::size_t n) {
    return bin(on_circle(-static_cast<double>(k * n % points) / static_cast<double>(points)));
  };
  for (std::size_t k = 0; k < radix; ++k) {
    Real *const near = near_.data() + 2 * k * group;
    for (std::size_t n = 0; n < group; ++n) {
      near[n] = factor(k, n).real();
      near[group + n] = factor(k, n).imag();
    }
    for (std::size_t n = 0; n < row; n += group) {
      const bin turn = factor(k, n);
      far_.data()[2 * (n + k)] = turn.real();
      far_.data()[2 * (n + k) + 1] = turn.imag();
    }
  }
}

template class radix_pass<float>;
template class radix_pass<double>;

}  // namespace dsp
