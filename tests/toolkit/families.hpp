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
