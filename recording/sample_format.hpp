// How samples lie in a file. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

namespace recording {

/// No name of parse_format stands for i24, which WAV files have.
enum class component { f32, f64, i8, i16, i24, i32, u8, u16, u32 };

/// I and Q one behind the other, or one component. Full scale is 1.0: floating point as it stands, signed integers of b
/// bits divided by 2^(b - 1), unsigned ones taken from the middle of their range (127.5 for eight bits) and divided by
/// it.
struct sample_format {
  component type = component::f32;
  bool is_complex = true;
  bool big_endian = false;

  [[nodiscard]] std::size_t components() const noexcept { return is_complex ? 2 : 1; }
  [[nodiscard]] std::size_t bytes() const noexcept;  // of one sample
  [[nodiscard]] bool is_floating() const noexcept { return type == component::f32 || type == component::f64; }
  [[nodiscard]] std::string name() const;
};

/// The names that parse_format takes, for messages.
inline constexpr const char *known_formats =
    "cf32, cf64, ci32, ci16, ci8, cu32, cu16, cu8, or real with r in front (rf32), with _le or _be";

/// A format as SigMF names it; without _le or _be it is little-endian. Throws failure for anything else.
sample_format parse_format(std::string_view name);

/// What the suffix of a raw file says, if it says anything.
std::optional<sample_format> format_of_suffix(const std::filesystem::path &file);

}  // namespace recording
