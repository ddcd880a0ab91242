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

/// Refuses an output of another length than its input.
inline void require_length(std::size_t out, std::size_t wanted) {
  if (out != wanted) throw error(status(LUMRA_TOO_LITTLE_ROOM), "an output is not as long as its input");
}

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

/// What get(object, &number) writes.
template <class Object, class Get>
std::size_t number_of(const Object *object, Get get) {
  std::uint64_t number = 0;
  check_open(get(object, &number));
  return static_cast<std::size_t>(number);
}

template <class Object, class Size, class Save>
std::vector<std::byte> save(const Object *object, Size size, Save save) {
  std::vector<std::byte> bytes(number_of(object, size));
  check_open(save(object, bytes.data(), bytes.size()));
  return bytes;
}

/// The one of a C function's four forms that takes elements of type T.
template <sample T, class F32, class F64, class CF32, class CF64>
constexpr auto form(F32 f32, F64 f64, CF32 cf32, CF64 cf64) noexcept {
  if constexpr (std::is_same_v<T, float>)
    return f32;
  else if constexpr (std::is_same_v<T, double>)
    return f64;
  else if constexpr (std::is_same_v<T, std::complex<float>>)
    return cf32;
  else
    return cf64;
}

// Elements as the C functions take them.
inline const lumra_cf32 *raw(const std::complex<float> *x) noexcept {
  return reinterpret_cast<const lumra_cf32 *>(x);
}
inline const lumra_cf64 *raw(const std::complex<double> *x) noexcept {
  return reinterpret_cast<const lumra_cf64 *>(x);
}
inline lumra_cf32 *raw(std::complex<float> *x) noexcept {
  return reinterpret_cast<lumra_cf32 *>(x);
}
inline lumra_cf64 *raw(std::complex<double> *x) noexcept {
  return reinterpret_cast<lumra_cf64 *>(x);
}
inline const float *raw(const float *x) noexcept {
  return x;
}
inline const double *raw(const double *x) noexcept {
  return x;
}
inline float *raw(float *x) noexcept {
  return x;
}
inline double *raw(double *x) noexcept {
  return x;
}

template <class T>
struct real_part {
  using type = T;
};
template <class T>
struct real_part<std::complex<T>> {
  using type = T;
};

}  // namespace detail

/// float or double, for T and for std::complex of it; and std::complex of that.
template <sample T>
using real_type = typename detail::real_part<T>::type;
template <sample T>
using complex_type = std::complex<real_type<T>>;

}  // namespace lumra
