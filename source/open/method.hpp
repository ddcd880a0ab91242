// What the doors to filters and convolutions share. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string_view>

#include "open/door.hpp"
#include "signal/convolution_method.hpp"

namespace doors {

constexpr bool is_method(std::int32_t method) noexcept {
  return method >= LUMRA_METHOD_AUTO && method <= LUMRA_METHOD_FOURIER;
}

inline dsp::convolution_method checked_method(std::int32_t method, std::string_view name) {
  require(is_method(method), LUMRA_UNKNOWN_CHOICE, name, " is ", method,
          ", which is no method; enum lumra_method names them");
  return static_cast<dsp::convolution_method>(method);
}

}  // namespace doors
