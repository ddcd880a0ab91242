// What the classes over the open interface's objects share. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/types.h>
#include <lumra/error.hpp>

#include <complex>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <type_traits>
#include <vector>

namespace lumra {

/// The elements that spans may have: float, double, and std::complex of them.
template <class T>
concept sample = std::is_same_v<T, float> || std::is_same_v<T, double> || std::is_same_v<T, std::complex<float>> ||
    std::is_same_v<T, std::complex<double>>;

namespace detail {

template <sample T>
inline constexpr std::int32_t type_code = std::is_same_v<T, float>                 ? LUMRA_TYPE_F32
                                          : std::is_same_v<T, double>              ? LUMRA_TYPE_F64
                                          : std::is_same_v<T, std::complex<float>> ? LUMRA_TYPE_CF32
                                                                                   : LUMRA_TYPE_CF64;

/// Frees an object with its C function.
template <auto free>
struct release {
  template <class Object>
  void operator()(Object *object) const noexcept {
    free(object);
  }
};

template <class Object, auto free>
using owned = std::unique_ptr<Object, release<free>>;

/// The object that create(&object) makes.
template <class Owned, class Create>
Owned make(Create create) {
  typename Owned::pointer object = nullptr;
  check_open(create(&object));
  return Owned(object);
}

template <class Object, class Size, class Save>
std::vector<std::byte> save(const Object *object, Size size, Save save) {
  std::vector<std::byte> bytes(static_cast<std::size_t>(size(object)));
  check_open(save(object, bytes.data(), bytes.size()));
  return bytes;
}

}  // namespace detail
}  // namespace lumra
