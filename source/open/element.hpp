// Element types as options name them. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/types.h>

#include <complex>
#include <cstdint>

#include "open/door.hpp"

namespace doors {

template <class T>
struct element {
  using value = T;
};

constexpr bool is_type(std::int32_t type) noexcept {
  return type == LUMRA_TYPE_F32 || type == LUMRA_TYPE_F64 || type == LUMRA_TYPE_CF32 || type == LUMRA_TYPE_CF64;
}
constexpr bool is_complex(std::int32_t type) noexcept {
  return type == LUMRA_TYPE_CF32 || type == LUMRA_TYPE_CF64;
}
constexpr bool is_single(std::int32_t type) noexcept {
  return type == LUMRA_TYPE_F32 || type == LUMRA_TYPE_CF32;
}

inline void require_type(std::int32_t type) {
  require(is_type(type), LUMRA_UNKNOWN_CHOICE, "options->type is ", type, "; it is one of enum lumra_type_code");
}

/// Calls work(element<T>{}) with the type that a number stands for.
template <class Work>
decltype(auto) with_type(std::int32_t type, Work &&work) {
  switch (type) {
    case LUMRA_TYPE_F32:
      return work(element<float>{});
    case LUMRA_TYPE_F64:
      return work(element<double>{});
    case LUMRA_TYPE_CF32:
      return work(element<std::complex<float>>{});
    default:
      return work(element<std::complex<double>>{});
  }
}

}  // namespace doors
