// Discrete Fourier transforms of one record. SPDX-License-Identifier: MIT
#include <lumra/toolkit.h>

#include <algorithm>
#include <cstdint>

#include "toolkit/arithmetic.hpp"
#include "toolkit/frame.hpp"
#include "toolkit/transform_slot.hpp"

namespace toolkit {
namespace {

/// Which bin of a spectrum comes first: that of frequency 0, or that of the most negative one.
enum class bin_order { natural, centred };

bin_order order_of(std::int32_t shift) noexcept {
  return shift != 0 ? bin_order::centred : bin_order::natural;
}

/// Writes the upper half of a real record's spectrum, the mirrored conjugate of the lower one.
template <class Complex>
void complete_spectrum(Complex *bins, std::int64_t n) noexcept {
  const std::int64_t mirrored = (n - 1) / 2;
  reverse_conjugate(bins + 1, bins + n - mirrored, mirrored);
}

template <class E>
void forward_fft(input<E> x, output<complex_of<E>> &y, std::int32_t size, bin_order order, scratch<E> pad,
                 transform_slot &slot) {
  require(x.count() >= 1, empty_input);
  const std::int32_t n = size < 1 ? x.count() : size;
  check_transform_size(n);
  refuse_sharing(pad, x, y);
  x.copy_if_same(y);
  const auto bins = y.resize(n);

  auto record = x.values();
  if (n > x.count()) {
    const auto padded = pad.resize(n);
    std::fill(std::copy(record.begin(), record.end(), padded.begin()), padded.end(), value_of<E>{});
    record = padded;
  }
  slot.get(transform_settings<E>(n, 0, scaling::none)).forward(record.data(), bins.data());
  if constexpr (!is_complex<E>) complete_spectrum(bins.data(), n);
  if (order == bin_order::centred) std::rotate(bins.begin(), bins.end() - n / 2, bins.end());
}

/// Bins of a spectrum in the order in which the transform takes them: 0 to n / 2 for a real record, else all.
template <class E>
std::span<const value_of<complex_of<E>>> natural_order(std::span<const value_of<complex_of<E>>> centred,
                                                       scratch<complex_of<E>> &gathered) {
  const auto n = static_cast<std::int64_t>(centred.size());
  const std::int64_t zero = n / 2;  // index of bin 0
  const auto bins = gathered.resize(is_complex<E> ? n : n / 2 + 1);
  const auto rest = std::copy(centred.begin() + zero, centred.end(), bins.begin());
  std::copy_n(centred.begin(), bins.end() - rest, rest);
  if constexpr (!is_complex<E>) {
    if (n % 2 == 0) {  // for even n two bins have no imaginary part
      bins.front() = bins.front().real();
      bins.back() = bins.back().real();
    }
  }
  return bins;
}

template <class E>
void inverse_fft(input<complex_of<E>> x, output<E> &y, bin_order order, scratch<complex_of<E>> gathered,
                 transform_slot &slot) {
  const std::int32_t n = x.count();
  require(n >= 1, empty_input);
  check_transform_size(n);
  refuse_sharing(gathered, x, y);
  x.copy_if_same(y);
  const auto record = y.resize(n);

  auto bins = x.values();
  if (order == bin_order::centred) bins = natural_order<E>(bins, gathered);
  slot.get(transform_settings<E>(n, 0, scaling::backward)).backward(bins.data(), record.data());
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define FFT(E)                                                                                                        \
  int32_t qsRFPELTA_##E##1DFFTH(handle<E> in, handle<complex_of<E>> out, int32_t size, int32_t shift,                 \
                                handle<E> workspace, void **slot) {                                                   \
    return toolkit_call([&](output<complex_of<E>> &y,                                                                 \
                            transform_slot &kept) { forward_fft<E>(in, y, size, order_of(shift), workspace, kept); }, \
                        output<complex_of<E>>(out), transform_slot(slot));                                            \
  }                                                                                                                   \
  int32_t qsRFPELTA_##E##1DInvFFTH(handle<complex_of<E>> spectrum, handle<E> out, int32_t shift,                      \
                                   handle<complex_of<E>> workspace, void **slot) {                                    \
    return toolkit_call(                                                                                              \
        [&](output<E> &y, transform_slot &kept) { inverse_fft<E>(spectrum, y, order_of(shift), workspace, kept); },   \
        output<E>(out), transform_slot(slot));                                                                        \
  }
FFT(s)
FFT(d)
FFT(c)
FFT(z)
#undef FFT
