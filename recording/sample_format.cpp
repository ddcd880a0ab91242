// SPDX-License-Identifier: MIT
#include "recording/sample_format.hpp"

#include <algorithm>
#include <iterator>

#include "recording/failure.hpp"

namespace recording {
namespace {

struct component_entry {
  component type;
  const char *name;  // behind the letter for complex or real
  std::size_t bytes;
};
constexpr component_entry components[] = {
    {component::f32, "f32", 4}, {component::f64, "f64", 8}, {component::i8, "i8", 1},
    {component::i16, "i16", 2}, {component::i24, "i24", 3}, {component::i32, "i32", 4},
    {component::u8, "u8", 1},   {component::u16, "u16", 2}, {component::u32, "u32", 4},
};

constexpr const component_entry &entry_of(component type) {
  return *std::find_if(std::begin(components), std::end(components), [=](const auto &e) { return e.type == type; });
}

/// Suffixes of raw files that are not a name of parse_format.
constexpr struct {
  const char *suffix, *format;
} suffixes[] = {{"cfile", "cf32"}, {"fc32", "cf32"}, {"cs8", "ci8"},
                {"cs16", "ci16"},  {"sc8", "ci8"},   {"sc16", "ci16"}};

std::optional<sample_format> known_format(std::string_view name) {
  const bool big = name.ends_with("_be");
  if (big || name.ends_with("_le")) name.remove_suffix(3);
  if (!name.starts_with('c') && !name.starts_with('r')) return std::nullopt;
  for (const component_entry &entry : components)
    if (name.substr(1) == entry.name && entry.type != component::i24)
      return sample_format{entry.type, name.front() == 'c', big};
  return std::nullopt;
}

}  // namespace

std::size_t sample_format::bytes() const noexcept {
  return components() * entry_of(type).bytes;
}

std::string sample_format::name() const {
  const component_entry &entry = entry_of(type);
  const char *order = entry.bytes == 1 ? "" : big_endian ? "_be" : "_le";
  return fmt::format("{}{}{}", is_complex ? 'c' : 'r', entry.name, order);
}

sample_format parse_format(std::string_view name) {
  if (const auto known = known_format(name)) return *known;
  throw failure("unknown sample type '{}': use {}", name, known_formats);
}

std::optional<sample_format> format_of_suffix(const std::filesystem::path &file) {
  const std::string suffix = file.extension().string();
  const std::string_view name = std::string_view(suffix).substr(suffix.empty() ? 0 : 1);
  for (const auto &[known, format] : suffixes)
    if (name == known) return known_format(format);
  return known_format(name);
}

}  // namespace recording
