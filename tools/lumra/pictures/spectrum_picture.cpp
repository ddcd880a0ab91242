// SPDX-License-Identifier: MIT
#include "pictures/spectrum_picture.hpp"

#include <algorithm>
#include <cmath>

#include "terminal/units.hpp"

namespace tool {
namespace {

/// Wider spectra are drawn as the largest level in each of this many columns.
constexpr std::size_t columns = 1150;
constexpr std::size_t most_points = 8 * columns;

/// Level axis in whole divisions; room above the peak for its label.
struct level_range {
  double bottom, top, division;
};

level_range range_for(const std::vector<double> &levels) {
  std::vector<double> sorted = levels;
  // A few deep notches must not press the trace together.
  const auto low = sorted.begin() + static_cast<std::ptrdiff_t>(sorted.size() / 200);
  std::nth_element(sorted.begin(), low, sorted.end());
  const double peak = *std::max_element(levels.begin(), levels.end());
  const double bottom = std::max(*low - 2, peak - 190);
  const double division = peak - bottom > 100 ? 20 : peak - bottom > 25 ? 10 : 5;
  level_range range{division * std::floor(bottom / division), 0, division};
  range.top = division * std::ceil(peak / division);
  while (range.top - peak < 0.14 * (range.top - range.bottom)) range.top += division / 2;
  return range;
}

/// Distance of the marks on an axis of this length: 1, 2 or 5 times a power of ten, ten to twenty of them.
double mark_distance(double length) {
  const double decade = std::pow(10, std::floor(std::log10(length / 10)));
  for (const double step : {5.0, 2.0})
    if (length / 10 >= step * decade) return step * decade;
  return decade;
}

}  // namespace

std::string spectrum_script(const recording::source &source, const averaged_spectrum &spectrum, std::size_t peak,
                            const std::string &settings, picture_type type) {
  const std::size_t bins = spectrum.power.size();
  const std::size_t points = bins > most_points ? columns : bins;
  const frequency_unit unit = unit_for(source.rate / 2);
  std::vector<double> levels(points);
  std::string data;
  for (std::size_t point = 0; point < points; ++point) {
    const auto first = spectrum.power.begin() + static_cast<std::ptrdiff_t>(point * bins / points);
    const auto last = spectrum.power.begin() + static_cast<std::ptrdiff_t>((point + 1) * bins / points);
    const auto largest = std::max_element(first, last);
    levels[point] = decibels(*largest);
    fmt::format_to(std::back_inserter(data), "{:.9g} {:.3f}\n",
                   spectrum.offset(static_cast<std::size_t>(largest - spectrum.power.begin())) / unit.hertz,
                   levels[point]);
  }
  const level_range range = range_for(levels);

  // Bins cover the band from edge to edge. The offset from the centre keeps tick labels short.
  const double half = source.rate / 2 / unit.hertz;
  const bool has_centre = source.frequency.value_or(0) != 0;
  const std::string axis = has_centre ? fmt::format("Offset from {} ({})", exact_text(*source.frequency), unit.name)
                                      : fmt::format("Frequency ({})", unit.name);

  const double offset = spectrum.offset(peak);
  const double level = decibels(spectrum.power[peak]);
  const double x = offset / unit.hertz;
  // Above the peak nothing is drawn; at the borders the label leans inwards.
  const int lean = x < -0.8 * half ? 1 : x > 0.8 * half ? -1 : 0;
  const char *side = lean > 0 ? "left" : lean < 0 ? "right" : "center";
  const std::string where = frequency_text(source.frequency.value_or(0) + offset, spectrum.df);
  const std::string label = with_minus_signs(fmt::format("{}   {:.2f} dBFS", where, level));

  const std::string detector = points < bins ? fmt::format("  ·  highest of {:.0f} bins per column",
                                                           std::round(static_cast<double>(bins) / columns))
                                             : "";
  const bool png = type == picture_type::png;
  return picture_preamble(type, {1280, 720}) +
         fmt::format(
             "set title {} noenhanced offset 0,1.6 font '{}'\n"
             "set label 1 {} at graph 0.5,1.035 center noenhanced tc rgb '#505050'\n"
             "set tmargin 5\nset rmargin 4\nset lmargin 10\nset bmargin 4.2\n"
             "set border lw 1 lc rgb '#404040'\n"
             "set xlabel {} noenhanced offset 0,-0.3\nset ylabel 'Level (dBFS)' offset -0.5,0\n"
             "set xrange [{}:{}]\nset yrange [{}:{}]\n"
             "set xtics {}\nset ytics {}\nset mytics 2\nset tics scale 0.8,0.4\nset minussign\nset format x '%h'\nset "
             "format y '%h'\n"
             "set grid xtics ytics mytics lt 1 lw 0.8 lc rgb '#d4d4d4', lt 1 lw 0.6 lc rgb '#eeeeee'\n"
             "unset key\n",
             gnuplot_text(source.name), png ? "DejaVu Sans:Bold,14" : "sans-serif,20",
             gnuplot_text(settings + detector), gnuplot_text(axis), -half, half, range.bottom, range.top,
             mark_distance(2 * half), range.division) +
         fmt::format(
             "set label 2 {} at first {:.9g},{:.3f} {} offset {},1.4 noenhanced front tc rgb '#b02020'\n"
             "$trace << end_of_trace\n{}end_of_trace\n"
             "$peak << end_of_peak\n{:.9g} {:.3f}\nend_of_peak\n"
             "plot $trace using 1:2 with lines lw 1.2 lc rgb '#1f4e8c', \\\n"
             "  $peak using 1:($2 + {:.3f}) with points pt 11 ps 1.3 lc rgb '#b02020'\n",
             gnuplot_text(label), x, level, side, lean, data, x, level, 0.011 * (range.top - range.bottom));
}

}  // namespace tool
