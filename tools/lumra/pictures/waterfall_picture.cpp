// SPDX-License-Identifier: MIT
#include "pictures/waterfall_picture.hpp"

#include <algorithm>
#include <cmath>
#include <iterator>

#include "pictures/frequency_scale.hpp"
#include "terminal/append.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

/// Boxes beyond these would hide what they mark.
constexpr std::size_t most_boxes = 200, most_labels = 40;

/// From just below the noise floor to the highest level.
std::pair<double, double> levels_in(const waterfall_picture &picture) {
  std::vector<double> levels;
  for (const std::vector<float> &row : picture.levels_db)
    std::copy_if(row.begin(), row.end(), std::back_inserter(levels), [](float level) { return std::isfinite(level); });
  if (levels.empty()) return {NAN, NAN};
  const auto low = levels.begin() + static_cast<std::ptrdiff_t>(levels.size() / 20);
  std::nth_element(levels.begin(), low, levels.end());
  const double highest = *std::max_element(low, levels.end());
  const double lowest = std::max(*low, highest - 150);
  return {std::floor(lowest), std::max(std::ceil(highest), std::floor(lowest) + 5)};
}

}  // namespace

std::string waterfall_script(const waterfall_picture &picture, picture_type type) {
  const frequency_scale scale = scale_of(picture.low_hz, picture.high_hz, picture.centre_hz);
  const auto rows = static_cast<double>(picture.levels_db.size());
  const double end_s = picture.begin_s + rows * picture.step_s;
  const time_unit unit = time_unit_for(end_s);
  const auto time = [&](double seconds) { return seconds / unit.seconds; };
  const picture_frame frame{{1280, 900},
                            picture.title,
                            picture.settings,
                            scale.axis,
                            {fmt::format("Time ({})", unit.name), time(picture.begin_s), time(end_s),
                             mark_distance(time(end_s) - time(picture.begin_s), 8)}};
  const auto [low, high] = picture.range_db.value_or(levels_in(picture));
  if (std::isnan(low)) return empty_script(frame, "all samples are zero", type);
  std::string script = frame_script(frame, type);
  // Time runs down, as it does in a waterfall. Colours are of equal steps in brightness, for eyes and for print.
  append(script,
         "set lmargin at screen 0.08\nset rmargin at screen 0.86\nset bmargin at screen 0.09\n"
         "set tmargin at screen 0.895\nset grid noxtics noytics nomxtics nomytics\nset tics out\n"
         "set style textbox opaque fillcolor rgb '#101010' noborder margins 0.3,0.3\n"
         "set colorbox user origin screen 0.88,screen 0.09 size screen 0.022,screen 0.805\n"
         "set yrange [{:.12g}:{:.12g}]\n"
         "set cbrange [{:.6g}:{:.6g}]\nset cblabel {} offset 1.5,0\nset format cb '%.10h'\n"
         "set palette defined (0 '#000004', 1 '#1d1147', 2 '#51127c', 3 '#832681', 4 '#b73779', 5 '#e75263', "
         "6 '#fc8961', 7 '#fec488', 8 '#fcfdbf')\n",
         time(end_s), time(picture.begin_s), low, high, gnuplot_text(fmt::format("Level ({})", picture.level_unit)));
  int number = 2;
  for (const waterfall_box &box : picture.boxes) {
    const double left = std::max(scale.at(box.low_hz), scale.axis.low);
    const double right = std::min(scale.at(box.high_hz), scale.axis.high);
    const double top = std::max(time(box.begin_s), time(picture.begin_s)),
                 bottom = std::min(time(box.end_s), time(end_s));
    if (left >= right || top >= bottom) continue;
    if (static_cast<std::size_t>(number) >= most_boxes) break;
    append(script,
           "set object {} rectangle from first {:.12g},first {:.12g} to first {:.12g},first {:.12g} front "
           "fs empty border lc rgb '#40ff80' lw 1.2\n",
           number, left, top, right, bottom);
    if (static_cast<std::size_t>(number) < most_labels && !box.text.empty()) {
      // Above the box where there is room, else inside of it.
      const bool inside = top - time(picture.begin_s) < 0.04 * (time(end_s) - time(picture.begin_s));
      const bool leans = left > scale.axis.low + 0.7 * (scale.axis.high - scale.axis.low);
      append(script,
             "set label {} {} at first {:.12g},first {:.12g} {} offset {},{} noenhanced front boxed "
             "tc rgb '#40ff80' font ',10'\n",
             number, gnuplot_text(box.text), leans ? right : left, top, leans ? "right" : "left", leans ? -0.3 : 0.3,
             inside ? -0.6 : 0.5);
    }
    ++number;
  }
  script += "$levels << end_of_levels\n";
  for (const std::vector<float> &row : picture.levels_db) {
    for (const float level : row)
      append(script, "{:.1f} ", std::isfinite(level) ? static_cast<double>(level) : low - 1000);
    script += '\n';
  }
  const auto columns = static_cast<double>(picture.levels_db.front().size());
  const double width = (scale.axis.high - scale.axis.low) / columns, height = time(picture.step_s);
  append(script,
         "end_of_levels\n"
         "plot $levels matrix using ({:.12g}+($1+0.5)*{:.12g}):({:.12g}+($2+0.5)*{:.12g}):3 with image notitle\n",
         scale.axis.low, width, time(picture.begin_s), height);
  return script;
}

}  // namespace tool
