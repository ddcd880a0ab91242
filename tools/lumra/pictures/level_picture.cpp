// SPDX-License-Identifier: MIT
#include "pictures/level_picture.hpp"

#include <algorithm>
#include <cmath>
#include <iterator>
#include <limits>
#include <utility>

#include "terminal/append.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

constexpr const char *key = "set key at graph 0.99,0.985 right top reverse Left noenhanced samplen 2 opaque\n";

/// Of samples whose parts are Gaussian: one part of real samples, two of complex ones.
double gaussian_share(double above_db, bool is_real) {
  const double power = std::pow(10, above_db / 10);
  return is_real ? std::erfc(std::sqrt(power / 2)) : std::exp(-power);
}

}  // namespace

std::string ccdf_script(const std::string &title, const std::string &settings, const std::vector<ccdf_curve> &curves,
                        picture_type type) {
  double right = 12, lowest = 1e-3;
  for (const ccdf_curve &curve : curves)
    for (std::size_t i = 0; i < curve.above_db.size(); ++i)
      if (curve.probability[i] > 0) {
        right = std::max(right, curve.above_db[i] + 0.5);
        lowest = std::min(lowest, curve.probability[i]);
      }
  const double bottom = std::pow(10, std::max(std::floor(std::log10(lowest)), -9.0));
  const picture_frame frame{{1280, 720},
                            title,
                            settings,
                            {"Power above the mean (dB)", 0, right, right > 20 ? 5.0 : 1.0},
                            {"Share of the samples above", bottom, 1, 10}};
  if (std::all_of(curves.begin(), curves.end(), [](const ccdf_curve &curve) { return curve.above_db.empty(); }))
    return empty_script(frame, "all samples are zero", type);
  std::string script = frame_script(frame, type);
  append(script, "set logscale y\nset ytics 10\nset mytics 10\nset format y '10^{{%T}}'\n{}", key);
  std::string plots = "plot ";
  const bool real = curves.front().is_real;
  script += "$gaussian << end_of_curve\n";
  constexpr int points_per_decibel = 20;
  for (int k = 0; k <= right * points_per_decibel; ++k) {
    const double above = static_cast<double>(k) / points_per_decibel, share = gaussian_share(above, real);
    if (share >= bottom) append(script, "{:.3f} {:.6g}\n", above, share);
  }
  script += "end_of_curve\n";
  for (std::size_t i = 0; i < curves.size(); ++i) {
    append(script, "$curve{} << end_of_curve\n", i);
    for (std::size_t k = 0; k < curves[i].above_db.size(); ++k)
      if (curves[i].probability[k] > 0)
        append(script, "{:.3f} {:.9g}\n", curves[i].above_db[k], curves[i].probability[k]);
    script += "end_of_curve\n";
    append(plots, "$curve{} using 1:2 with lines lw 2 lc rgb '{}' title {}, \\\n  ", i, curve_colour(i),
           gnuplot_text(curves[i].name));
  }
  return script + plots + "$gaussian using 1:2 with lines lw 1.5 dt 2 lc rgb '#707070' title 'Gaussian noise'\n";
}

std::string envelope_script(const std::string &title, const std::string &settings, const std::string &level_unit,
                            const std::vector<envelope_curve> &curves, picture_type type) {
  double end = 0, highest = -std::numeric_limits<double>::infinity();
  std::vector<double> levels;
  for (const envelope_curve &curve : curves) {
    end = std::max(end, curve.time_s.back());
    for (const double level : curve.rms_db)
      if (std::isfinite(level)) levels.push_back(level);
    for (const double level : curve.peak_db) highest = std::max(highest, level);
  }
  const time_unit unit = time_unit_for(end);
  picture_frame frame{
      {1280, 720},
      title,
      settings,
      {fmt::format("Time ({})", unit.name), 0, end / unit.seconds, mark_distance(end / unit.seconds, 10)},
      {fmt::format("Level ({})", level_unit), -100, 0, 10}};
  if (levels.empty()) return empty_script(frame, "all samples are zero", type);
  const double lowest = std::max(*std::min_element(levels.begin(), levels.end()), highest - 120);
  frame.y.division = highest - lowest > 50 ? 10 : highest - lowest > 15 ? 5 : 2;
  frame.y.low = frame.y.division * std::floor(lowest / frame.y.division - 0.2);
  frame.y.high = frame.y.division * std::ceil(highest / frame.y.division + 0.4);
  std::string script = frame_script(frame, type) + key, plots;
  const auto number = [&](double level) { return std::isfinite(level) ? fmt::format(" {:.3f}", level) : " NaN"; };
  for (std::size_t i = 0; i < curves.size(); ++i) {
    const envelope_curve &curve = curves[i];
    append(script, "$curve{} << end_of_curve\n", i);
    for (std::size_t k = 0; k < curve.time_s.size(); ++k)
      append(script, "{:.9g}{}{}\n", curve.time_s[k] / unit.seconds, number(curve.rms_db[k]), number(curve.peak_db[k]));
    script += "end_of_curve\n";
    const std::string name = curves.size() > 1 ? ", " + curve.name : "";
    append(plots,
           "{0}$curve{1} using 1:3 with lines lw 0.8 dt 3 lc rgb '{2}' title {3}, \\\n"
           "  $curve{1} using 1:2 with lines lw 1.4 lc rgb '{2}' title {4}",
           i == 0 ? "plot " : ", \\\n  ", i, curve_colour(i), gnuplot_text("Peak" + name), gnuplot_text("RMS" + name));
  }
  return script + plots + "\n";
}

}  // namespace tool
