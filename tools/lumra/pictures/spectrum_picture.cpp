// SPDX-License-Identifier: MIT
#include "pictures/spectrum_picture.hpp"

#include <algorithm>
#include <cmath>
#include <iterator>
#include <limits>
#include <utility>

#include "pictures/frequency_scale.hpp"
#include "terminal/append.hpp"

namespace tool {
namespace {

/// Points of a curve with a band, about as many as a picture has pixels; more bins than twice that share points.
constexpr std::size_t columns = 1150;

std::size_t points_for(std::size_t bins) {
  return bins > 2 * columns ? columns : bins;
}

/// Level axis in whole divisions; room above the highest for labels.
picture_axis level_axis(const spectrum_picture &picture) {
  std::vector<double> levels, lowest;
  double highest = -std::numeric_limits<double>::infinity();
  for (const spectrum_curve &curve : picture.curves) {
    const auto copy_finite = [](const std::vector<double> &from, std::vector<double> &to) {
      std::copy_if(from.begin(), from.end(), std::back_inserter(to), [](double x) { return std::isfinite(x); });
    };
    copy_finite(curve.level_db, levels);
    copy_finite(curve.lowest_db, lowest);
    for (const auto *some : {&curve.level_db, &curve.highest_db})
      for (const double level : *some)
        if (std::isfinite(level)) highest = std::max(highest, level);
  }
  const std::string title = fmt::format("Level ({})", picture.level_unit);
  if (levels.empty()) return {title, -100, 0, 10};
  // A few deep notches must not press the curve together, nor must a band that reaches far down.
  const auto low_of = [](std::vector<double> &some) {
    const auto low = some.begin() + static_cast<std::ptrdiff_t>(some.size() / 200);
    std::nth_element(some.begin(), low, some.end());
    return *low;
  };
  double low = low_of(levels) - 2;
  if (!lowest.empty()) low = std::clamp(low_of(lowest) - 2, low - 20, low);
  const double bottom = std::max(std::min(low, highest - 5), highest - 190);
  const double division = highest - bottom > 100 ? 20 : highest - bottom > 25 ? 10 : 5;
  picture_axis axis{title, division * std::floor(bottom / division), division * std::ceil(highest / division),
                    division};
  const auto rows = static_cast<double>(std::max(picture.stretches.size(), picture.list.size()));
  while (axis.high - highest < (0.14 + 0.05 * rows) * (axis.high - axis.low)) axis.high += division / 2;
  return axis;
}

void add_number(std::string &row, double value) {
  if (std::isfinite(value))
    append(row, " {:.3f}", value);
  else
    row += " NaN";
}

std::string rows_of(const spectrum_curve &curve, const frequency_scale &scale, double bottom) {
  std::string rows;
  for (std::size_t k = 0; k < curve.level_db.size(); ++k) {
    append(rows, "{:.12g}", scale.at(curve.frequency_hz[k]));
    add_number(rows, curve.level_db[k]);
    if (!curve.lowest_db.empty()) {
      // Silence in the band reaches down to the axis.
      add_number(rows, std::max(curve.lowest_db[k], bottom));
      add_number(rows, curve.highest_db[k]);
    }
    rows += '\n';
  }
  return rows;
}

}  // namespace

spectrum_curve curve_of(std::string name, const lumra::averaged_spectrum &spectrum,
                        std::pair<std::size_t, std::size_t> bins, double calibration_db) {
  const std::size_t count = bins.second - bins.first, points = points_for(count);
  const bool held = !spectrum.maximum.empty();
  const auto level = [&](double power) { return 10 * std::log10(power) + calibration_db; };
  spectrum_curve curve;
  curve.name = std::move(name);
  for (std::size_t point = 0; point < points; ++point) {
    const std::size_t first = bins.first + point * count / points, last = bins.first + (point + 1) * count / points;
    double sum = 0, lowest = std::numeric_limits<double>::infinity(), highest = 0;
    for (std::size_t k = first; k < last; ++k) {
      sum += spectrum.power[k];
      lowest = std::min(lowest, held ? spectrum.minimum[k] : spectrum.power[k]);
      highest = std::max(highest, held ? spectrum.maximum[k] : spectrum.power[k]);
    }
    curve.frequency_hz.push_back((spectrum.frequency(first) + spectrum.frequency(last - 1)) / 2);
    curve.level_db.push_back(level(sum / static_cast<double>(last - first)));
    if (!held && points == count) continue;
    curve.lowest_db.push_back(level(lowest));
    curve.highest_db.push_back(level(highest));
  }
  return curve;
}

std::string band_text(const lumra::averaged_spectrum &spectrum, std::pair<std::size_t, std::size_t> bins) {
  const std::size_t count = bins.second - bins.first, points = points_for(count);
  const bool held = !spectrum.maximum.empty();
  if (points == count) return held ? "band: lowest to highest segment" : "";
  return fmt::format("band: lowest to highest of {:.0f} bins{}, line: their mean",
                     std::round(static_cast<double>(count) / static_cast<double>(points)),
                     held ? " in any segment" : "");
}

std::string spectrum_script(const spectrum_picture &picture, picture_type type) {
  const frequency_scale scale = scale_of(picture.low_hz, picture.high_hz, picture.centre_hz);
  const picture_frame frame{{1280, 720}, picture.title, picture.settings, scale.axis, level_axis(picture)};
  const bool silent = std::all_of(picture.curves.begin(), picture.curves.end(), [](const spectrum_curve &curve) {
    return std::none_of(curve.level_db.begin(), curve.level_db.end(), [](double x) { return std::isfinite(x); });
  });
  if (silent) return empty_script(frame, "all samples are zero", type);

  std::string script = frame_script(frame, type);
  const auto add = [&](auto text, auto &&...values) {
    append_formatted(script, text, fmt::make_format_args(values...));
  };
  // The axis ends where the band does; numbers that are drawn lie inside.
  int number = 2;
  const double height = frame.y.high - frame.y.low;
  for (std::size_t i = 0; i < picture.stretches.size(); ++i) {
    const spectrum_stretch &stretch = picture.stretches[i];
    const double low = std::max(scale.at(stretch.low_hz), scale.axis.low);
    const double high = std::min(scale.at(stretch.high_hz), scale.axis.high);
    if (low >= high) continue;
    const double place = frame.y.high - (0.035 + 0.055 * static_cast<double>(i)) * height;
    const double middle = (low + high) / 2, inside = (middle - scale.axis.low) / (scale.axis.high - scale.axis.low);
    const char *side = inside < 0.2 ? "left" : inside > 0.8 ? "right" : "center";
    if (!stretch.is_bare)
      add("set object {} rectangle from first {:.12g},graph 0 to first {:.12g},first {:.6g} fs solid 0.10 noborder "
          "fc rgb '{}' behind\n",
          number, low, high, place, curve_colour(i));
    add("set arrow {} from first {:.12g},{:.6g} to first {:.12g},{:.6g} heads filled size screen 0.006,20 front "
        "lc rgb '{}'\n",
        number, low, place, high, place, curve_colour(i));
    add("set label {} {} at first {:.12g},{:.6g} {} offset 0,-0.7 noenhanced front tc rgb '{}'\n", number,
        gnuplot_text(with_minus_signs(stretch.text)),
        inside < 0.2   ? low
        : inside > 0.8 ? high
                       : middle,
        place, side, curve_colour(i));
    ++number;
  }
  std::string marks;
  const auto inside_of = [&](double x) { return (x - scale.axis.low) / (scale.axis.high - scale.axis.low); };
  for (const spectrum_mark &mark : picture.marks) {
    const double x = scale.at(mark.frequency_hz), inside = inside_of(x);
    if (!(inside >= 0 && inside <= 1) || !std::isfinite(mark.level_db)) continue;
    const char *side = inside < 0.15 ? "left" : inside > 0.85 ? "right" : "center";
    add("set label {} {} at first {:.12g},{:.3f} {} offset 0,1.4 noenhanced front tc rgb '#b02020'\n", number++,
        gnuplot_text(with_minus_signs(mark.text)), x, mark.level_db, side);
    append(marks, "{:.12g} {:.3f}\n", x, mark.level_db + 0.011 * height);
  }
  // The list stands on the side where the highest mark is not.
  if (!picture.list.empty()) {
    const bool right = !picture.is_shared && inside_of(scale.at(picture.marks.front().frequency_hz)) < 0.5;
    for (std::size_t i = 0; i < picture.list.size(); ++i)
      add("set label {} {} at graph {},graph 0.96 {} offset 0,{} noenhanced front tc rgb '#b02020'\n", number++,
          gnuplot_text(with_minus_signs(picture.list[i])), right ? 0.985 : 0.015, right ? "right" : "left",
          -1.2 * static_cast<double>(i));
  }
  for (std::size_t i = 0; i < picture.curves.size(); ++i)
    add("$curve{} << end_of_curve\n{}end_of_curve\n", i, rows_of(picture.curves[i], scale, frame.y.low));
  if (!marks.empty()) add("$marks << end_of_marks\n{}end_of_marks\n", marks);
  if (picture.is_shared) add("set key at graph 0.99,0.985 right top reverse Left noenhanced samplen 2 opaque\n");
  const char *before = "plot ";
  for (std::size_t i = 0; i < picture.curves.size(); ++i) {
    const spectrum_curve &curve = picture.curves[i];
    if (!curve.lowest_db.empty())
      add("{}$curve{} using 1:3:4 with filledcurves fs transparent solid 0.30 noborder lc rgb '{}' notitle",
          std::exchange(before, ", \\\n  "), i, curve_colour(i));
    add("{}$curve{} using 1:2 with {} lw 1.2 lc rgb '{}' {}", std::exchange(before, ", \\\n  "), i,
        curve.level_db.size() < 40 ? "linespoints pt 7 ps 0.5" : "lines", curve_colour(i),
        picture.is_shared ? "title " + gnuplot_text(curve.name) : "notitle");
  }
  if (!marks.empty()) add(", \\\n  $marks using 1:2 with points pt 11 ps 1.3 lc rgb '#b02020' notitle");
  return script + "\n";
}

}  // namespace tool
