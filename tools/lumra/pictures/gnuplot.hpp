// Pictures drawn by gnuplot. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>
#include <string>
#include <string_view>

#include "terminal/output_file.hpp"

namespace tool {

enum class picture_type { png, svg };

struct picture_size {
  int width, height;  // pixels
};

/// The suffix, .png or .svg, decides; throws failure for another one, and when gnuplot is not there.
picture_type picture_type_of(const std::filesystem::path &file);

/// The beginning of a script: terminal, fonts, encoding.
std::string picture_preamble(picture_type type, picture_size size);

/// A text as a quoted string of gnuplot; bytes that it or a picture could not show become '?'.
std::string gnuplot_text(std::string_view text);

/// Hyphens of numbers as the minus signs that pictures show.
std::string with_minus_signs(std::string text);

/// Runs a script and stores the picture that it draws. Throws failure with gnuplot's own reason.
void draw(const std::string &script, picture_type type, output_file &out);

}  // namespace tool
