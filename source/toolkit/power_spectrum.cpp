// Two-sided power spectrum of one record. SPDX-License-Identifier: MIT
#include <lumra/toolkit.h>

#include <cstdint>

#include "toolkit/arithmetic.hpp"
#include "toolkit/frame.hpp"
#include "toolkit/transform_slot.hpp"

namespace toolkit {
namespace {

template <class E>
void power_spectrum(input<E> x, output<magnitude_of<E>> &out, scratch<E> room, transform_slot &slot) {
  const std::int64_t n = x.count();
  require(n >= 1, empty_input);
  check_transform_size(n);
  refuse_sharing(room, x, out);
  x.copy_if_same(out);
  real_of<E> *const p = out.resize(n).data();
  auto *const bins = reinterpret_cast<value_of<complex_of<E>> *>(room.resize(n + 2).data());
  slot.get(transform_settings<E>(n, 0, scaling::none)).forward(x.values().data(), bins);

  const double scale = 1.0 / (static_cast<double>(n) * static_cast<double>(n));
  if constexpr (is_complex<E>) {
    scaled_power(bins, p, nullptr, scale, n);
  } else {
    // Bin 0 and, for even n, bin n / 2 are real, and what MKL leaves in their imaginary parts does not count.
    const auto real_bin = [&](std::int64_t k) {
      const real_of<E> re = bins[k].real();
      p[k] = static_cast<real_of<E>>(static_cast<double>(re * re) * scale);
    };
    const std::int64_t mirrored = (n - 1) / 2;
    real_bin(0);
    scaled_power(bins + 1, p + 1, p + n - mirrored, scale, mirrored);
    if (n % 2 == 0) real_bin(n / 2);
  }
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define POWER_SPECTRUM(E)                                                                                            \
  int32_t qsRFPELTA_##E##PowerSpectrumH(handle<E> in, handle<magnitude_of<E>> out, handle<E> scratch, void **slot) { \
    return toolkit_call(                                                                                             \
        [&](output<magnitude_of<E>> &power, transform_slot &kept) { power_spectrum<E>(in, power, scratch, kept); },  \
        output<magnitude_of<E>>(out), transform_slot(slot));                                                         \
  }
POWER_SPECTRUM(s)
POWER_SPECTRUM(d)
POWER_SPECTRUM(c)
POWER_SPECTRUM(z)
#undef POWER_SPECTRUM
