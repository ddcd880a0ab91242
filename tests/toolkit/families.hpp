// The exports of each type letter under one name per operation. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/toolkit.h>

#include "toolkit/element.hpp"

namespace tests {

template <class E>
struct family;

#define FAMILY(E)                                                  \
  template <>                                                      \
  struct family<toolkit::E> {                                      \
    static constexpr auto fft = &qsRFPELTA_##E##1DFFTH;            \
    static constexpr auto inverse_fft = &qsRFPELTA_##E##1DInvFFTH; \
  };
FAMILY(s)
FAMILY(d)
FAMILY(c)
FAMILY(z)
#undef FAMILY

}  // namespace tests
