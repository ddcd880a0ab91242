// What the terminals behind the standard streams can show. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace tool {

/// Columns of the terminal that this stream is, or 80.
std::size_t columns_of(int stream) noexcept;

/// Whether bold text may be written to this stream: a terminal that is not dumb, and NO_COLOR is not set.
bool is_styled(int stream) noexcept;

/// Whether the stream is a terminal that can return to the beginning of a line and erase it.
bool redraws_lines(int stream) noexcept;

/// Columns that a text takes: one for each of its characters, as far as the program's own texts go.
std::size_t width_of(std::string_view text) noexcept;

/// Breaks a text at its spaces into lines of at most `width` columns, all but the first behind `indent` spaces. Words
/// that are longer stay whole.
std::string wrapped(std::string_view text, std::size_t width, std::size_t indent);

}  // namespace tool
