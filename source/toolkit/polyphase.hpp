// Dot products of taps and samples by type. Samples can be read, not only used, up to a group of taps.
// SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <cstdint>

#include "qsrfhs/vector/kernels/kernels.hpp"

namespace toolkit {

constexpr std::int64_t tap_group = 8;

constexpr std::int64_t in_groups(std::int64_t taps) noexcept {
  return (taps + tap_group - 1) & -tap_group;
}

template <class Real>
using tap_place = qsrfhs::kernels::tap_place<Real>;
template <class Real>
using tap_rows = qsrfhs::kernels::tap_rows<Real>;
using tap_offsets = qsrfhs::kernels::tap_offsets;

// An array and not lanes, which are slower here: most filters end in the middle of a group.
template <class Real, class T>
void polyphase(const tap_place<Real> *places, std::int64_t outputs, const tap_rows<Real> &rows, const T *x,
               T *out) noexcept {
  for (; outputs > 0; --outputs, ++places) {
    const Real *taps = rows.taps + std::int64_t{places->row} * 2 * rows.length, fraction = places->fraction;
    const T *in = x + places->first;
    T sum[tap_group] = {};
    std::int64_t left = places->count;
    for (; left >= tap_group; left -= tap_group, taps += 2 * tap_group, in += tap_group)
      for (std::int64_t l = 0; l < tap_group; ++l) sum[l] += (taps[l] + fraction * taps[l + tap_group]) * in[l];
    for (std::int64_t l = 0; l < left; ++l) sum[l] += (taps[l] + fraction * taps[l + tap_group]) * in[l];
    *out++ = ((sum[0] + sum[4]) + (sum[2] + sum[6])) + ((sum[1] + sum[5]) + (sum[3] + sum[7]));
  }
}
inline void polyphase(const tap_place<float> *places, std::int64_t outputs, const tap_rows<float> &rows, const float *x,
                      float *out) noexcept {
  qsrfhs::kernels::exact().polyphase(places, static_cast<std::size_t>(outputs), rows, x, out);
}
inline void polyphase(const tap_place<float> *places, std::int64_t outputs, const tap_rows<float> &rows,
                      const std::complex<float> *x, std::complex<float> *out) noexcept {
  qsrfhs::kernels::exact().complex_polyphase(places, static_cast<std::size_t>(outputs), rows,
                                             reinterpret_cast<const float *>(x), reinterpret_cast<float *>(out));
}

inline void stretched(const tap_place<float> *places, std::int64_t outputs, const tap_offsets &taps, const float *x,
                      float *out) noexcept {
  qsrfhs::kernels::exact().stretched(places, static_cast<std::size_t>(outputs), taps, x, out);
}
inline void stretched(const tap_place<float> *places, std::int64_t outputs, const tap_offsets &taps,
                      const std::complex<float> *x, std::complex<float> *out) noexcept {
  qsrfhs::kernels::exact().complex_stretched(places, static_cast<std::size_t>(outputs), taps,
                                             reinterpret_cast<const float *>(x), reinterpret_cast<float *>(out));
}

}  // namespace toolkit
