// The loops have no branch in them, so that they are vectorised. SPDX-License-Identifier: MIT
#include "recording/sample_codec.hpp"

#include <bit>
#include <cmath>
#include <cstring>
#include <limits>
#include <type_traits>

namespace recording {
namespace {

template <std::size_t Size>
using bits = std::conditional_t<
    Size == 1, std::uint8_t,
    std::conditional_t<Size == 2, std::uint16_t, std::conditional_t<Size == 4, std::uint32_t, std::uint64_t>>>;

template <class Bits>
Bits swapped(Bits value) noexcept {
  if constexpr (sizeof(Bits) == 2) return __builtin_bswap16(value);
  if constexpr (sizeof(Bits) == 4) return __builtin_bswap32(value);
  if constexpr (sizeof(Bits) == 8) return __builtin_bswap64(value);
  return value;
}

/// A component of the C++ type T in the file's byte order.
template <class T, bool Swap>
struct plain {
  using value = T;
  static constexpr std::size_t bytes = sizeof(T);
  static constexpr T lowest = std::numeric_limits<T>::lowest(), highest = std::numeric_limits<T>::max();

  static T load(const std::byte *from) noexcept {
    bits<sizeof(T)> value;
    std::memcpy(&value, from, sizeof value);
    return std::bit_cast<T>(Swap ? swapped(value) : value);
  }
  static void store(T x, std::byte *to) noexcept {
    auto value = std::bit_cast<bits<sizeof(T)>>(x);
    if (Swap) value = swapped(value);
    std::memcpy(to, &value, sizeof value);
  }
};

/// Three bytes to an integer.
template <bool Swap>
struct packed24 {
  using value = std::int32_t;
  static constexpr std::size_t bytes = 3;
  static constexpr value lowest = -(1 << 23), highest = (1 << 23) - 1;

  static value load(const std::byte *from) noexcept {
    const auto at = [&](std::size_t i) { return static_cast<std::uint32_t>(from[Swap ? 2 - i : i]); };
    return static_cast<value>(at(0) << 8 | at(1) << 16 | at(2) << 24) >> 8;
  }
  static void store(value x, std::byte *to) noexcept {
    for (std::size_t i = 0; i < 3; ++i) to[Swap ? 2 - i : i] = static_cast<std::byte>(x >> (8 * i));
  }
};

template <class Component>
constexpr bool is_floating = std::is_floating_point_v<typename Component::value>;
template <class Component>
constexpr bool is_signed = Component::lowest < 0;

template <class Component, class Real>
Real scaled(typename Component::value value) noexcept {
  if constexpr (is_floating<Component>) {
    return static_cast<Real>(value);
  } else if constexpr (is_signed<Component>) {
    // A power of two changes no digit, so that this is rounded once.
    constexpr auto unit = static_cast<Real>(-1.0 / static_cast<double>(Component::lowest));
    return static_cast<Real>(value) * unit;
  } else {
    // Twice the distance from the middle is a whole number; that of 32 bits is exact in double precision alone.
    using wide = std::conditional_t<Component::bytes == 4, double, Real>;
    constexpr auto largest = static_cast<wide>(Component::highest);
    return static_cast<Real>((2 * static_cast<wide>(value) - largest) / largest);
  }
}

template <class Component, class Real>
void decode_all(std::span<const std::byte> bytes, std::span<Real> out) noexcept {
  const std::byte *const from = bytes.data();
  Real *const to = out.data();
  for (std::size_t i = 0; i < out.size(); ++i)
    to[i] = scaled<Component, Real>(Component::load(from + i * Component::bytes));
}

/// Stores the nearest value and tells whether it is in the type's range.
template <class Component>
bool store_nearest(double x, std::byte *to) noexcept {
  using value = typename Component::value;
  constexpr auto lowest = static_cast<double>(Component::lowest), highest = static_cast<double>(Component::highest);
  double y = x;
  if constexpr (!is_floating<Component>)
    y = std::rint(is_signed<Component> ? x * -lowest : x * (highest / 2) + highest / 2);
  Component::store(y < lowest ? Component::lowest : y > highest ? Component::highest : static_cast<value>(y), to);
  return y >= lowest && y <= highest;
}

template <class Component>
std::uint64_t encode_all(std::span<const double> in, std::span<std::byte> bytes, std::size_t parts) noexcept {
  std::uint64_t beyond = 0;
  for (std::size_t i = 0; i < in.size(); i += parts) {
    bool near = true;
    for (std::size_t part = i; part < i + parts; ++part)
      near &= store_nearest<Component>(in[part], bytes.data() + part * Component::bytes);
    beyond += near ? 0 : 1;
  }
  return beyond;
}

template <class Component, std::size_t Parts>
std::uint64_t count_at_ends(std::span<const std::byte> bytes) noexcept {
  if constexpr (is_floating<Component>) return 0;
  constexpr std::size_t width = Parts * Component::bytes;
  std::uint64_t clipped = 0;
  for (std::size_t i = 0; i < bytes.size() / width; ++i) {
    bool at_end = false;
    for (std::size_t part = 0; part < Parts; ++part) {
      const auto x = Component::load(bytes.data() + i * width + part * Component::bytes);
      at_end |= (x == Component::lowest) | (x == Component::highest);
    }
    clipped += at_end ? 1 : 0;
  }
  return clipped;
}

template <bool Swap, class Work>
auto with_order(component type, Work work) {
  switch (type) {
    case component::f32:
      return work(plain<float, Swap>());
    case component::f64:
      return work(plain<double, Swap>());
    case component::i8:
      return work(plain<std::int8_t, false>());
    case component::i16:
      return work(plain<std::int16_t, Swap>());
    case component::i24:
      return work(packed24<Swap>());
    case component::i32:
      return work(plain<std::int32_t, Swap>());
    case component::u8:
      return work(plain<std::uint8_t, false>());
    case component::u16:
      return work(plain<std::uint16_t, Swap>());
    case component::u32:
      return work(plain<std::uint32_t, Swap>());
  }
  __builtin_unreachable();
}

/// Calls work with the component's type.
template <class Work>
auto with_component(const sample_format &format, Work work) {
  static_assert(std::endian::native == std::endian::little);
  return format.big_endian ? with_order<true>(format.type, work) : with_order<false>(format.type, work);
}

}  // namespace

void decode(const sample_format &format, std::span<const std::byte> bytes, std::span<float> out) {
  with_component(format, [&](auto type) { decode_all<decltype(type)>(bytes, out); });
}

void decode(const sample_format &format, std::span<const std::byte> bytes, std::span<double> out) {
  with_component(format, [&](auto type) { decode_all<decltype(type)>(bytes, out); });
}

std::uint64_t encode(const sample_format &format, std::span<const double> in, std::span<std::byte> bytes) {
  return with_component(format, [&](auto type) { return encode_all<decltype(type)>(in, bytes, format.components()); });
}

std::uint64_t count_clipped(const sample_format &format, std::span<const std::byte> bytes) {
  return with_component(format, [&](auto type) {
    return format.is_complex ? count_at_ends<decltype(type), 2>(bytes) : count_at_ends<decltype(type), 1>(bytes);
  });
}

}  // namespace recording
