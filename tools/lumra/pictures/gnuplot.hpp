// Pictures drawn by gnuplot. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>
#include <string>
#include <string_view>

#include "terminal/output_file.hpp"

namespace tool {

enum class picture_type { png, svg, pdf };

struct picture_size {
  int width, height;  // pixels
};

/// One axis: its title, its ends, the distance of its numbers.
struct picture_axis {
  std::string title;
  double low, high, division;
};

/// What stands around the curves of every picture.
struct picture_frame {
  picture_size size{1280, 720};
  std::string title;     // as it is; a long one is drawn smaller
  std::string settings;  // the line below it
  picture_axis x, y;
};

/// The suffix, .png, .svg or .pdf, decides; throws failure for another one, and when gnuplot is not there.
picture_type picture_type_of(const std::filesystem::path &file);

/// The beginning of a script: terminal, fonts, title, axes, grid; no key.
std::string frame_script(const picture_frame &frame, picture_type type);

/// A frame with one line in its middle, for nothing that could be drawn.
std::string empty_script(const picture_frame &frame, const std::string &reason, picture_type type);

/// 1, 2 or 5 times a power of ten, such that an axis of this length has `marks` to twice as many marks or so.
double mark_distance(double length, int marks);

/// A colour for each of several curves.
const char *curve_colour(std::size_t curve);

/// A text as a quoted string of gnuplot; bytes that it or a picture could not show become '?'.
std::string gnuplot_text(std::string_view text);

/// Hyphens of numbers as the minus signs that pictures show.
std::string with_minus_signs(std::string text);

/// Runs a script and stores the picture that it draws. Throws failure with gnuplot's own reason.
void draw(const std::string &script, picture_type type, output_file &out);

}  // namespace tool
