// Samples times real weights. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <type_traits>

#include "qsrfhs/vector/kernels/kernels.hpp"

namespace dsp {

/// out[k] = x[k] w[k]. out may be x.
template <class Sample, class Real>
void weigh(const Sample *x, const Real *w, Sample *out, std::size_t n) noexcept {
  const auto &kernels = qsrfhs::kernels::exact();
  if constexpr (std::is_same_v<Sample, std::complex<float>>) {
    kernels.apply_window(reinterpret_cast<const float *>(x), w, reinterpret_cast<float *>(out), n);
  } else if constexpr (std::is_same_v<Sample, float>) {
    kernels.weigh(x, w, out, n / 2);  // pairs
    if (n % 2 != 0) out[n - 1] = x[n - 1] * w[n - 1];
  } else if constexpr (std::is_same_v<Sample, double>) {
    kernels.weigh_double(x, w, out, n);
  } else {
    for (std::size_t k = 0; k < n; ++k) out[k] = x[k] * w[k];
  }
}

}  // namespace dsp
