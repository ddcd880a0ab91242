// The exports of each type letter under one name per operation. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/toolkit.h>

#include "toolkit/element.hpp"

namespace tests {

template <class E>
struct family;

#define FAMILY(E)                                                                  \
  template <>                                                                      \
  struct family<toolkit::E> {                                                      \
    static constexpr auto fft = &qsRFPELTA_##E##1DFFTH;                            \
    static constexpr auto inverse_fft = &qsRFPELTA_##E##1DInvFFTH;                 \
    static constexpr auto convolution = &qsRFPELTA_##E##1DConvolutionH;            \
    static constexpr auto matrix_correlation = &qsRFPELTA_##E##2DCorrelationH;     \
    static constexpr auto window = &qsRFPELTA_##E##AllCosWinH;                     \
    static constexpr auto power_spectrum = &qsRFPELTA_##E##PowerSpectrumH;         \
    static constexpr auto decimate = &qsRFPELTA_##E##DecimateH;                    \
    static constexpr auto resample = &qsRFPELTA_##E##ResampleC2CH;                 \
    static constexpr auto resample_channels = &qsRFPELTA_##E##ResampleMultiChC2CH; \
    static constexpr auto rms = &qsRFPELTA_##E##RMSH;                              \
  };
FAMILY(s)
FAMILY(d)
FAMILY(c)
FAMILY(z)
#undef FAMILY

/// The members that are there for real data, for single precision, or under names of two letters.
template <class E>
struct partial_family;

#define REAL_FAMILY(E) static constexpr auto linear_fit = &qsRFPELTA_##E##LinearFitH;
#define SINGLE_FAMILY(E)                                               \
  static constexpr auto multiply = &qsRFPELTA_##E##MtrxMulH;           \
  static constexpr auto multiply_vector = &qsRFPELTA_##E##MtrxVecMulH; \
  static constexpr auto least_squares = &qsRFPELTA_##E##LSEqH;
#define PARTIAL_FAMILY(E, NAME, ...)                                    \
  template <>                                                           \
  struct partial_family<toolkit::E> {                                   \
    static constexpr auto filter = &qsRFPELTA_##NAME##IIRDirectFilterH; \
    __VA_ARGS__                                                         \
  };
PARTIAL_FAMILY(s, ss, REAL_FAMILY(s) SINGLE_FAMILY(s))
PARTIAL_FAMILY(d, dd, REAL_FAMILY(d))
PARTIAL_FAMILY(c, cs, SINGLE_FAMILY(c))
PARTIAL_FAMILY(z, zd)
#undef PARTIAL_FAMILY
#undef SINGLE_FAMILY
#undef REAL_FAMILY

/// A recursive filter; for z one array is the workspace of all coefficients, and more_numbers is not looked at.
template <class E, class F = toolkit::magnitude_of<E>, class More>
std::int32_t filter(toolkit::handle<E> data, toolkit::handle<F> reverse, toolkit::handle<F> forward,
                    toolkit::handle<E> forward_state, toolkit::handle<E> reverse_state, std::int32_t reset,
                    toolkit::handle<F> numbers, More &&more_numbers, toolkit::handle<E> inputs) {
  constexpr auto run = partial_family<E>::filter;
  if constexpr (std::is_same_v<E, toolkit::z>)
    return run(data, reverse, forward, forward_state, reverse_state, reset, numbers, inputs);
  else
    return run(data, reverse, forward, forward_state, reverse_state, reset, numbers, more_numbers, inputs);
}

/// The two records of a correlation, and its export.
template <class First, class Second>
struct correlation_pair;

#define CORRELATION(NAME, E, F)                                          \
  template <>                                                            \
  struct correlation_pair<toolkit::E, toolkit::F> {                      \
    using x = toolkit::E;                                                \
    using y = toolkit::F;                                                \
    using lags = toolkit::common_of<x, y>;                               \
    static constexpr auto correlate = &qsRFPELTA_##NAME##1DCorrelationH; \
  };
CORRELATION(s, s, s)
CORRELATION(d, d, d)
CORRELATION(c, c, c)
CORRELATION(z, z, z)
CORRELATION(sc, s, c)
CORRELATION(cs, c, s)
CORRELATION(dz, d, z)
CORRELATION(zd, z, d)
#undef CORRELATION

}  // namespace tests
