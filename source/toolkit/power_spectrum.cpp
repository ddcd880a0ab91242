// Two-sided power spectrum of one record. SPDX-License-Identifier: MIT
#include <lumra/toolkit.h>

#include <cstdint>

#include "toolkit/frame.hpp"
#include "toolkit/transform_slot.hpp"

namespace toolkit {
namespace {

/// |X|^2 * scale: the sum in the element's type, the product in double.
template <class Real>
Real power(const std::complex<Real> &bin, double scale) noexcept {
  const Real squared = bin.real() * bin.real() + bin.imag() * bin.imag();
  return static_cast<Real>(static_cast<double>(squared) * scale);
}

template <class Real>
Real power(Real bin, double scale) noexcept {
  return static_cast<Real>(static_cast<double>(bin * bin) * scale);
}

template <class E>
void power_spectrum(input<E> x, output<magnitude_of<E>> &out, scratch<E> room, transform_slot slot) {
  const std::int64_t n = x.count();
  require(n >= 1, empty_input);
  check_transform_size(n);
  room.keep_apart_from(x, out);
  x.keep_apart_from(out);
  real_of<E> *const p = out.resize(n).data();
  auto *const bins = reinterpret_cast<value_of<complex_of<E>> *>(room.resize(n + 2).data());
  slot.get(vector_transform<E>(n, scaling::none)).forward(x.values().data(), bins);

  const double scale = 1.0 / (static_cast<double>(n) * static_cast<double>(n));
  if constexpr (is_complex<E>) {
    for (std::int64_t k = 0; k < n; ++k) p[k] = power(bins[k], scale);
  } else {
    p[0] = power(bins[0].real(), scale);
    for (std::int64_t k = 1; k <= (n - 1) / 2; ++k) p[n - k] = p[k] = power(bins[k], scale);
    if (n % 2 == 0) p[n / 2] = power(bins[n / 2].real(), scale);
  }
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define POWER_SPECTRUM(E)                                                                                            \
  int32_t qsRFPELTA_##E##PowerSpectrumH(handle<E> in, handle<magnitude_of<E>> out, handle<E> scratch, void **slot) { \
    output<magnitude_of<E>> power(out);                                                                              \
    return toolkit_call([&] { power_spectrum<E>(in, power, scratch, slot); }, power);                                \
  }
POWER_SPECTRUM(s)
POWER_SPECTRUM(d)
POWER_SPECTRUM(c)
POWER_SPECTRUM(z)
#undef POWER_SPECTRUM
