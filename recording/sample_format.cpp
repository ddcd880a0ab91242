// SPDX-License-Identifier: MIT
#include "recording/sample_format.hpp"

#include <algorithm>
#include <bit>
#include <cstdint>
#include <cstring>
#include <limits>
#include <type_traits>

#include "recording/failure.hpp"

namespace recording {
namespace {

struct component_entry {
  component type;
  const char *name;
  std::size_t bytes;
};
constexpr component_entry components[] = {
    {component::f32, "cf32", 4}, {component::f64, "cf64", 8}, {component::i8, "ci8", 1},   {component::i16, "ci16", 2},
    {component::i32, "ci32", 4}, {component::u8, "cu8", 1},   {component::u16, "cu16", 2}, {component::u32, "cu32", 4},
};

constexpr const component_entry &entry_of(component type) {
  return *std::find_if(std::begin(components), std::end(components), [=](const auto &e) { return e.type == type; });
}

/// Suffixes of raw files that are not a name of parse_format.
constexpr struct {
  const char *suffix, *format;
} suffixes[] = {{"cfile", "cf32"}, {"fc32", "cf32"}, {"cs8", "ci8"},
                {"cs16", "ci16"},  {"sc8", "ci8"},   {"sc16", "ci16"}};

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

template <class T>
float scaled(T value) noexcept {
  if constexpr (std::is_floating_point_v<T>) return static_cast<float>(value);
  constexpr double largest = static_cast<double>(std::numeric_limits<T>::max());
  if constexpr (std::is_signed_v<T>) return static_cast<float>(static_cast<double>(value) * (1.0 / (largest + 1.0)));
  constexpr double middle = largest / 2;
  return static_cast<float>((static_cast<double>(value) - middle) * (1.0 / middle));
}

template <class T, bool Swap>
void decode_components(const std::byte *in, float *out, std::size_t count) noexcept {
  for (std::size_t i = 0; i < count; ++i) {
    bits<sizeof(T)> value;
    std::memcpy(&value, in + i * sizeof(T), sizeof(T));
    out[i] = scaled(std::bit_cast<T>(Swap ? swapped(value) : value));
  }
}

template <class T>
void decode_components(bool swap, const std::byte *in, float *out, std::size_t count) noexcept {
  swap ? decode_components<T, true>(in, out, count) : decode_components<T, false>(in, out, count);
}

}  // namespace

std::size_t sample_format::bytes() const noexcept {
  return 2 * entry_of(type).bytes;
}

std::string sample_format::name() const {
  const component_entry &entry = entry_of(type);
  if (entry.bytes == 1) return entry.name;
  return std::string(entry.name) + (big_endian ? "_be" : "_le");
}

sample_format parse_format(std::string_view name) {
  std::string_view stem = name;
  const bool big = stem.ends_with("_be");
  if (big || stem.ends_with("_le")) stem.remove_suffix(3);
  for (const component_entry &entry : components)
    if (stem == entry.name) return {entry.type, big};
  if (name.starts_with('r'))
    throw failure("samples of type {} are real; only complex ones are analysed: {}", name, known_formats);
  throw failure("unknown sample type '{}': use {}", name, known_formats);
}

std::optional<sample_format> format_of_suffix(const std::filesystem::path &file) {
  std::string suffix = file.extension().string();
  if (suffix.empty()) return std::nullopt;
  suffix.erase(0, 1);
  for (const auto &[known, format] : suffixes)
    if (suffix == known) return parse_format(format);
  const std::string stem = suffix.substr(0, suffix.find('_'));
  for (const component_entry &entry : components)
    if (stem == entry.name) return parse_format(suffix);
  return std::nullopt;
}

void decode(sample_format format, std::span<const std::byte> bytes, std::span<std::complex<float>> out) {
  const std::byte *in = bytes.data();
  auto *to = reinterpret_cast<float *>(out.data());
  const std::size_t count = 2 * out.size();
  const bool swap = format.big_endian != (std::endian::native == std::endian::big);
  switch (format.type) {
    case component::f32:
      return decode_components<float>(swap, in, to, count);
    case component::f64:
      return decode_components<double>(swap, in, to, count);
    case component::i8:
      return decode_components<std::int8_t>(swap, in, to, count);
    case component::i16:
      return decode_components<std::int16_t>(swap, in, to, count);
    case component::i32:
      return decode_components<std::int32_t>(swap, in, to, count);
    case component::u8:
      return decode_components<std::uint8_t>(swap, in, to, count);
    case component::u16:
      return decode_components<std::uint16_t>(swap, in, to, count);
    case component::u32:
      return decode_components<std::uint32_t>(swap, in, to, count);
  }
}

}  // namespace recording
