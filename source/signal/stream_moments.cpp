// SPDX-License-Identifier: MIT
#include "signal/stream_moments.hpp"

#include <algorithm>
#include <bit>
#include <cmath>
#include <numbers>

#include "signal/rotation.hpp"

namespace dsp {
namespace {

using wide = std::complex<double>;

// The unknowns: parts of the gain and of dc, delay, and frequency.
enum : std::size_t { gain_re, gain_im, dc_re, dc_im, delay, frequency, unknown_count };
using unknowns = std::array<double, unknown_count>;

/// Normal equations of the corrections to the unknowns that are free.
struct normal_equations {
  std::array<std::array<double, unknown_count>, unknown_count> matrix{};
  unknowns right{};

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

/// The equations around a gain and a dc that fit, of sums whose times count from their centre.
normal_equations equations_of(const stream_moments &s, double samples, wide gain, wide dc) noexcept {
  // What the columns are multiples of: u, 1, v and t u. Products are of the conjugated first with the second.
  const wide one_u = std::conj(s.reference_dc), v_tu = std::conj(s.timed_slope);
  const wide products[4][4] = {
      {s.reference, one_u, s.slope_reference, s.timed},
      {std::conj(one_u), samples, s.slope_dc, s.timed_dc},
      {std::conj(s.slope_reference), std::conj(s.slope_dc), s.slope, v_tu},
      {s.timed, std::conj(s.timed_dc), std::conj(v_tu), s.timed_twice},
  };
  const wide measured[4] = {s.product, s.measured_dc, s.slope_measured, s.timed_product};
  constexpr std::size_t base[unknown_count] = {0, 0, 1, 1, 2, 3};
  const wide j(0, 1), factor[unknown_count] = {1, j, 1, j, gain, 2 * std::numbers::pi * times(j, gain)};
  normal_equations made;
  for (std::size_t a = 0; a < unknown_count; ++a) {
    const wide conjugate = std::conj(factor[a]), *const row = products[base[a]];
    made.right[a] = times(conjugate, measured[base[a]] - times(gain, row[0]) - times(dc, row[1])).real();
    for (std::size_t b = 0; b <= a; ++b) made.matrix[a][b] = times(times(conjugate, factor[b]), row[base[b]]).real();
  }
  return made;
}

}  // namespace

template <class Sample>
void stream_moments::add(std::span<const wide> carried, std::span<const wide> slopes, const Sample *measured_samples,
                         double t) noexcept {
  stream_moments here;
  for (std::size_t k = 0; k < carried.size(); ++k) {
    const wide u = carried[k], m = wide(measured_samples[k]), mu = times(m, std::conj(u));
    const double at = t + static_cast<double>(k), p = std::norm(u);
    here.reference += p;
    here.measured += std::norm(m);
    here.product += mu;
    here.reference_dc += u;
    here.measured_dc += m;
    here.timed += at * p;
    here.timed_twice += at * at * p;
    here.timed_product += at * mu;
    here.timed_dc += at * u;
  }
  for (std::size_t k = 0; k < slopes.size(); ++k) {
    const wide u = carried[k], m = wide(measured_samples[k]), v = slopes[k], vu = times(v, std::conj(u));
    here.slope += std::norm(v);
    here.slope_reference += vu;
    here.slope_measured += times(m, std::conj(v));
    here.slope_dc += v;
    here.timed_slope += (t + static_cast<double>(k)) * vu;
  }
  auto all = std::bit_cast<numbers>(*this);
  const auto more = std::bit_cast<numbers>(here);
  for (std::size_t k = 0; k < count; ++k) all[k] += more[k];
  *this = std::bit_cast<stream_moments>(all);
}

void stream_moments::add(const stream_moments &other) noexcept {
  auto sums = std::bit_cast<numbers>(*this);
  const auto added = std::bit_cast<numbers>(other);
  for (std::size_t k = 0; k < sums.size(); ++k) sums[k] += added[k];
  *this = std::bit_cast<stream_moments>(sums);
}

stream_moments stream_moments::later(double earlier) const noexcept {
  stream_moments moved = *this;
  moved.timed_twice += earlier * (2 * timed + earlier * reference);
  moved.timed += earlier * reference;
  moved.timed_product += earlier * product;
  moved.timed_dc += earlier * reference_dc;
  moved.timed_slope += earlier * slope_reference;
  return moved;
}

alignment_outcome improve(const stream_moments &sums, double samples, const alignment &wanted, model_change &change) {
  constexpr double no_variation = 1e-12;
  const auto all = std::bit_cast<stream_moments::numbers>(sums);
  if (!std::all_of(all.begin(), all.end(), [](double v) { return std::isfinite(v); }))
    return alignment_outcome::unrelated;
  if (!(sums.reference > 0 && sums.measured > 0)) return alignment_outcome::unrelated;
  const double centre = sums.timed / sums.reference;
  const stream_moments s = sums.later(-centre);
  const double share = wanted.dc ? 1 / samples : 0;
  const double reference = s.reference - share * std::norm(s.reference_dc);
  const wide product = s.product - share * times(s.measured_dc, std::conj(s.reference_dc));
  if (!(reference > no_variation * s.reference)) return alignment_outcome::undetermined;
  const wide gain = product / reference, dc = share * (s.measured_dc - times(gain, s.reference_dc));
  change.fitted = std::norm(gain) * reference;
  change.measured = s.measured - share * std::norm(s.measured_dc);

  unknowns x{};
  const std::array<bool, unknown_count> is_free{true, true, wanted.dc, wanted.dc, wanted.delay, wanted.frequency};
  if (wanted.searched() && !equations_of(s, samples, gain, dc).solve(is_free, x))
    return alignment_outcome::undetermined;
  change.delay = x[delay];
  change.frequency = x[frequency];
  change.gain = times(gain + wide(x[gain_re], x[gain_im]), on_circle(-change.frequency * centre));
  if (wanted.gain || !wanted.dc) {
    change.dc = dc + wide(x[dc_re], x[dc_im]);
  } else {
    const wide turn(0, 2 * std::numbers::pi * change.frequency);
    const wide reference_dc = s.reference_dc + change.delay * s.slope_dc + times(turn, s.timed_dc);
    const wide carried = times(times(change.kept_gain, reference_dc), on_circle(change.frequency * centre));
    change.dc = (s.measured_dc - carried) / samples;
  }
  return alignment_outcome::found;
}

template void stream_moments::add(std::span<const wide>, std::span<const wide>, const std::complex<float> *,
                                  double) noexcept;
template void stream_moments::add(std::span<const wide>, std::span<const wide>, const std::complex<double> *,
                                  double) noexcept;

}  // namespace dsp
