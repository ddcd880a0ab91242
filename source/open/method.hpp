// What the doors to filters and convolutions share. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string_view>

#include "open/door.hpp"
#include "signal/convolution_method.hpp"

namespace doors {

inline dsp::convolution_method checked_method(std::int32_t method, std::string_view name) {
  require(method >= LUMRA_METHOD_AUTO && method <= LUMRA_METHOD_FOURIER, LUMRA_UNKNOWN_CHOICE, name, " is ", method,
          ", which is no method; enum lumra_method names them");
  return static_cast<dsp::convolution_method>(method);
}

}  // namespace doors
