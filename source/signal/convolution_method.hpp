// How a convolution is computed, and what the ways cost. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/filter.h>

#include <algorithm>
#include <bit>
#include <cmath>
#include <complex>
#include <cstddef>
#include <cstdint>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "signal/block_transform.hpp"

namespace dsp {

enum class convolution_method : std::int32_t {
  automatic = LUMRA_METHOD_AUTO,
  direct = LUMRA_METHOD_DIRECT,
  fourier = LUMRA_METHOD_FOURIER
};

/// out[k] = sum over j < count of taps[j] * x[k - j], n outputs apart from x, summed in this order wherever k lies.
/// `readable` bytes behind the last sample are read, too.
template <class Sample, class Tap>
void apply_taps(const Sample *x, const Tap *taps, std::size_t count, Sample *out, std::size_t n) noexcept {
  using real = real_of<Sample>;
  const auto &kernels = qsrfhs::kernels::fused();
  const auto *samples = reinterpret_cast<const real *>(x);
  const auto *values = reinterpret_cast<const real *>(taps);
  auto *sums = reinterpret_cast<real *>(out);
  constexpr std::size_t width = is_complex<Sample> ? 2 : 1;
  constexpr bool is_single = sizeof(real) == sizeof(float);
  if constexpr (is_complex<Tap> && is_single)
    kernels.complex_fir(samples, values, count, sums, n);
  else if constexpr (is_complex<Tap>)
    kernels.complex_fir_double(samples, values, count, sums, n);
  else if constexpr (is_single)
    kernels.fir(samples, values, count, width, sums, width * n);
  else
    kernels.fir_double(samples, values, count, width, sums, width * n);
}
inline constexpr std::size_t readable = 32;

/// out[k] = a[k] b[k]; out may be a.
inline void multiply_bins(const std::complex<float> *a, const std::complex<float> *b, std::complex<float> *out,
                          std::size_t n) noexcept {
  qsrfhs::kernels::exact().multiply(reinterpret_cast<const float *>(a), reinterpret_cast<const float *>(b),
                                    reinterpret_cast<float *>(out), n);
}
inline void multiply_bins(const std::complex<double> *a, const std::complex<double> *b, std::complex<double> *out,
                          std::size_t n) noexcept {
  qsrfhs::kernels::exact().multiply_double(reinterpret_cast<const double *>(a), reinterpret_cast<const double *>(b),
                                           reinterpret_cast<double *>(out), n);
}
/// a[k] *= b[k].
template <class Bin>
void multiply_bins(Bin *a, const Bin *b, std::size_t n) noexcept {
  multiply_bins(a, b, a, n);
}

// Costs in multiply-adds of real taps and samples in single precision, which are done eight at a time. The constants
// are measured beside MKL's transforms (open_filter_bench).

/// Of one tap for one output.
template <class Sample, class Tap>
inline constexpr double tap_cost = sizeof(real_of<Sample>) / sizeof(float) * (is_complex<Sample> ? 2.0 : 1.0) *
                                   (is_complex<Tap> ? 2.0 : 1.0);

/// Of a block through both transforms: of `length` points, with copies and the product of the spectra.
template <class Sample>
double block_cost(std::size_t length) noexcept {
  constexpr double caches[] = {50e3, 1e6};      // bytes
  constexpr double slower[] = {1.0, 1.6, 3.0};  // where a block fits neither
  constexpr bool is_double = sizeof(real_of<Sample>) == sizeof(double);
  constexpr double stage = is_double ? (is_complex<Sample> ? 5.6 : 3.4) : (is_complex<Sample> ? 3.2 : 1.4);
  constexpr double rest = 2.0 * sizeof(Sample);  // beside the stages
  const auto points = static_cast<double>(length);
  const double bytes = 3 * points * sizeof(Sample);
  const double slowness = slower[bytes <= caches[0] ? 0 : bytes <= caches[1] ? 1 : 2];
  return points * (stage * slowness * std::log2(points) + rest);
}

/// Smallest number of points not below `least` for which MKL is fast: a multiple of 32 without prime factors above 7.
inline std::size_t fast_length(std::size_t least) noexcept {
  for (std::size_t n = (least + 31) / 32;; ++n) {
    std::size_t rest = n;
    for (const unsigned prime : {7U, 5U, 3U, 2U})
      while (rest % prime == 0) rest /= prime;
    if (rest == 1) return 32 * n;
  }
}

/// The transform for overlap-save blocks of that many taps, at most most_fft_points / 2: a power of two, and the
/// shortest that costs no more than a tenth above the cheapest for one sample. Long ones are kept short, for memory.
template <class Sample>
std::size_t best_block(std::size_t taps) noexcept {
  constexpr std::size_t shortest = 64, long_enough = std::size_t{1} << 18;
  const auto cost = [taps](std::size_t length) {
    return block_cost<Sample>(length) / static_cast<double>(length - taps + 1);
  };
  const std::size_t first = std::max(shortest, std::bit_ceil(2 * taps));
  const std::size_t last = std::clamp(2 * first, long_enough, most_fft_points);
  double cheapest = cost(first);
  for (std::size_t length = 2 * first; length <= last; length *= 2) cheapest = std::min(cheapest, cost(length));
  std::size_t length = first;
  while (cost(length) > 1.1 * cheapest) length *= 2;
  return length;
}

}  // namespace dsp
