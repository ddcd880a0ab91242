// SPDX-License-Identifier: MIT
#include "pictures/constellation_picture.hpp"
#include "terminal/append.hpp"

#include <algorithm>
#include <cmath>
#include <iterator>
#include <set>

namespace tool {
namespace {

constexpr std::uint64_t most_points = 20000;

/// More different reference points than this are no symbols but a path, drawn finer and below the measured points.
constexpr std::size_t most_symbols = 1100;

/// Points that would be drawn over each other are one.
std::string rows_of(const std::vector<std::complex<double>> &points, double grid, std::size_t &count) {
  std::set<std::pair<long, long>> taken;
  std::string rows;
  for (const std::complex<double> &point : points)
    if (taken.emplace(std::lround(point.real() / grid), std::lround(point.imag() / grid)).second)
      append(rows, "{:.5g} {:.5g}\n", point.real(), point.imag());
  count = taken.size();
  return rows;
}

}  // namespace

constellation::constellation(std::uint64_t samples) noexcept
    : samples_(samples), wanted_(std::min(samples, most_points)) {}

std::uint64_t constellation::next() const noexcept {
  const std::uint64_t index = reference_.size();
  if (index >= wanted_) return samples_;
  if (!is_partial()) return index;
  // One sample of each of the equal parts, at places that change from part to part: a fixed distance would see the
  // same symbols of a periodic signal again and again.
  const double part = static_cast<double>(samples_) / static_cast<double>(wanted_);
  const double place = static_cast<double>(index) * 0.6180339887498949;
  return static_cast<std::uint64_t>((static_cast<double>(index) + place - std::floor(place)) * part);
}

void constellation::add(std::complex<double> reference, std::complex<double> measured) {
  reference_.push_back(reference);
  measured_.push_back(measured);
}

std::string constellation_script(const constellation &points, const std::string &title, const std::string &figures,
                                 picture_type type) {
  double largest = 0;
  for (const auto *all : {&points.reference(), &points.measured()})
    for (const std::complex<double> &point : *all)
      largest = std::max({largest, std::abs(point.real()), std::abs(point.imag())});
  const double limit = 1.08 * largest;
  const double grid = limit / 2000;
  std::size_t distinct = 0, drawn = 0;
  const std::string measured = rows_of(points.measured(), grid, drawn);
  const std::string reference = rows_of(points.reference(), grid, distinct);
  const bool symbols = distinct <= most_symbols;
  // Few points may be large; many must leave their density visible.
  const double point_size = drawn < 500 ? 0.6 : drawn < 5000 ? 0.35 : 0.22;
  const std::string measured_plot =
      fmt::format("$measured using 1:2 with points pt 7 ps {} lc rgb '#1f4e8c' notitle", point_size);
  const std::string reference_plot =
      fmt::format("$reference using 1:2 with points pt 2 ps {} lw {} lc rgb '#d02020' notitle", symbols ? 1.4 : 0.4,
                  symbols ? 2.0 : 0.8);
  const std::string share =
      points.is_partial() ? fmt::format("{} of {} samples drawn", points.measured().size(), points.samples()) : "";
  const double division = mark_distance(limit, 4);
  const picture_frame frame{{900, 960},
                            title,
                            with_minus_signs(figures),
                            {"In phase (reference RMS = 1)", -limit, limit, division},
                            {"Quadrature (reference RMS = 1)", -limit, limit, division}};
  return frame_script(frame, type) +
         fmt::format(
             "set label 2 {} at graph 1,-0.108 right noenhanced tc rgb '#505050'\n"
             "set rmargin 3\nset lmargin 9\nset bmargin 5.5\nset size ratio -1\nset mxtics 2\n"
             "set xzeroaxis lt 1 lw 1 lc rgb '#909090'\nset yzeroaxis lt 1 lw 1 lc rgb '#909090'\n"
             "set key at graph 0,-0.095 left top horizontal Left reverse samplen 1 width 2\n",
             gnuplot_text(share)) +
         fmt::format(
             "$measured << end_of_measured\n{}end_of_measured\n"
             "$reference << end_of_reference\n{}end_of_reference\n"
             "plot {}, \\\n  {}, \\\n"
             "  NaN with points pt 7 ps 0.7 lc rgb '#1f4e8c' title 'Measured', \\\n"
             "  NaN with points pt 2 ps 1.1 lw 1.8 lc rgb '#d02020' title 'Reference'\n",
             measured, reference, symbols ? measured_plot : reference_plot, symbols ? reference_plot : measured_plot);
}

}  // namespace tool
