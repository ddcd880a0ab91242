// SPDX-License-Identifier: MIT
#include "signal/evm_refinement.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <complex>
#include <cstddef>
#include <numbers>

#include "signal/rotation.hpp"

namespace dsp {
namespace {

using wide = std::complex<double>;

// The unknowns: parts of the gain and of dc, delay, and turns of the carrier over half of the part.
enum : std::size_t { gain_re, gain_im, dc_re, dc_im, delay, turns, unknown_count };
using unknowns = std::array<double, unknown_count>;

/// Normal equations of the corrections to the unknowns that are free.
struct normal_equations {
  std::array<std::array<double, unknown_count>, unknown_count> matrix{};
  unknowns right{};

  void add(const std::array<wide, unknown_count> &columns, wide error) noexcept {
    for (std::size_t i = 0; i < unknown_count; ++i) {
      right[i] += columns[i].real() * error.real() + columns[i].imag() * error.imag();
      for (std::size_t j = 0; j <= i; ++j)
        matrix[i][j] += columns[i].real() * columns[j].real() + columns[i].imag() * columns[j].imag();
    }
  }

  /// By Cholesky's method on columns of length 1; unknowns that are not free stay 0. False where a column is, to eight
  /// digits, a combination of the others.
  bool solve(const std::array<bool, unknown_count> &is_free, unknowns &x) const noexcept {
    constexpr double smallest_pivot = 1e-8;
    std::array<std::array<double, unknown_count>, unknown_count> l{};
    unknowns scale{}, y{};
    x = {};
    for (std::size_t i = 0; i < unknown_count; ++i) {
      if (!is_free[i]) continue;
      if (!(matrix[i][i] > 0)) return false;
      scale[i] = 1 / std::sqrt(matrix[i][i]);
      for (std::size_t j = 0; j <= i; ++j) {
        if (!is_free[j]) continue;
        double rest = matrix[i][j] * scale[i] * scale[j];
        for (std::size_t k = 0; k < j; ++k) rest -= l[i][k] * l[j][k];
        if (i == j && !(rest > smallest_pivot)) return false;
        l[i][j] = i == j ? std::sqrt(rest) : rest / l[j][j];
      }
      y[i] = right[i] * scale[i];
      for (std::size_t k = 0; k < i; ++k) y[i] -= l[i][k] * y[k];
      y[i] /= l[i][i];
    }
    for (std::size_t i = unknown_count; i-- > 0;) {
      if (!is_free[i]) continue;
      x[i] = y[i];
      for (std::size_t k = i + 1; k < unknown_count; ++k) x[i] -= l[k][i] * x[k];
      x[i] /= l[i][i];
    }
    for (std::size_t i = 0; i < unknown_count; ++i) x[i] *= scale[i];
    return true;
  }
};

}  // namespace

template <class Sample>
alignment_outcome refine(delayed_reference<Sample> &delayed, std::span<const Sample> measured, const alignment &wanted,
                         const stretch &part, refinement how, stream_model &model) {
  constexpr int most_rounds = 12;
  constexpr double least_correlation = 0.005;
  const double enough = how == refinement::full ? 1e-5 : 1e-2;  // of the last step, whose square is what is left
  const bool short_enough = part.count() <= longest_for_delay;
  const double half = static_cast<double>(part.count()) / 2, middle = static_cast<double>(part.first) + half;
  wide gain = 0, dc = 0;
  for (int round = 0; round < most_rounds; ++round) {
    // Gain and dc first: the columns of the others are made with them.
    const bool first_round = round == 0;
    const bool with_delay = wanted.delay && short_enough && !first_round, with_turns = wanted.frequency && !first_round;
    const std::array<bool, unknown_count> is_free{true, true, wanted.dc, wanted.dc, with_delay, with_turns};
    const stretch known = wanted.delay ? delayed.known(model.delay) : stretch{0, measured.size()};
    const stretch compared{std::max(part.first, known.first), std::min(part.last, known.last)};
    if (compared.first >= compared.last) return alignment_outcome::unrelated;
    normal_equations equations;
    double fitted_power = 0, error_power = 0;
    delayed.walk(compared, model.delay, with_delay ? slopes::computed : slopes::left_out,
                 [&](std::size_t first, auto values, auto derivatives) {
                   constexpr std::size_t run = 256;
                   std::array<wide, run> carried, sloped;
                   for (std::size_t begin = 0; begin < values.size(); begin += run) {
                     const std::size_t count = std::min(run, values.size() - begin);
                     const double from_middle = static_cast<double>(first + begin) - middle;
                     rotate(values.subspan(begin, count), model.frequency, from_middle, 1, carried);
                     if (with_delay) rotate(derivatives.subspan(begin, count), model.frequency, from_middle, 1, sloped);
                     for (std::size_t k = 0; k < count; ++k) {
                       const wide u = carried[k], fitted = times(gain, u);
                       const double turn = 2 * std::numbers::pi * (from_middle + static_cast<double>(k)) / half;
                       const wide error = wide(measured[first + begin + k]) - fitted - dc;
                       fitted_power += fitted.real() * fitted.real() + fitted.imag() * fitted.imag();
                       error_power += error.real() * error.real() + error.imag() * error.imag();
                       equations.add(
                           {u, wide(-u.imag(), u.real()), 1, wide(0, 1), with_delay ? times(gain, sloped[k]) : 0,
                            turn * wide(-fitted.imag(), fitted.real())},
                           error);
                     }
                   }
                 });
    unknowns change;
    if (!equations.solve(is_free, change)) return alignment_outcome::undetermined;
    if (!first_round && !(fitted_power >= least_correlation * (fitted_power + error_power)))
      return alignment_outcome::unrelated;
    gain += wide(change[gain_re], change[gain_im]);
    dc += wide(change[dc_re], change[dc_im]);
    model.delay += std::clamp(change[delay], -1.0, 1.0);
    model.frequency += change[turns] / half;
    if (!first_round && std::abs(change[delay]) < enough && std::abs(change[turns]) < enough) break;
  }
  return alignment_outcome::found;
}

template alignment_outcome refine(delayed_reference<std::complex<float>> &, std::span<const std::complex<float>>,
                                  const alignment &, const stretch &, refinement, stream_model &);
template alignment_outcome refine(delayed_reference<std::complex<double>> &, std::span<const std::complex<double>>,
                                  const alignment &, const stretch &, refinement, stream_model &);

}  // namespace dsp
