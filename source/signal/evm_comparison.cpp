// SPDX-License-Identifier: MIT
#include "signal/evm_comparison.hpp"

#include <mkl_vml.h>

#include <algorithm>
#include <array>
#include <cmath>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "signal/rotation.hpp"

namespace dsp {
namespace {

using wide = std::complex<double>;

constexpr std::size_t run = error_sums::longest_run;

/// Values of a run, real and imaginary parts in planes of their own, which the compiler's loops take side by side.
struct planes {
  std::array<double, run> re, im;
};

/// Squared magnitudes of a run.
void find_powers(const planes &x, std::size_t count, double *powers) noexcept {
  for (std::size_t k = 0; k < count; ++k) powers[k] = x.re[k] * x.re[k] + x.im[k] * x.im[k];
}

/// Angles of a run of products, those of 0 being 0.
void find_angles(planes &products, std::size_t count, double *angles) noexcept {
  for (std::size_t k = 0; k < count; ++k) {
    const bool none = products.re[k] == 0 && products.im[k] == 0;
    products.re[k] = none ? 1 : products.re[k];
    products.im[k] = none ? 0 : products.im[k];
  }
  vmdAtan2(static_cast<MKL_INT>(count), products.im.data(), products.re.data(), angles, VML_HA);
}

/// The largest of powers without NaNs.
double largest_of(const double *powers, std::size_t count) noexcept {
  constexpr std::size_t lanes = 8;
  double largest[lanes];
  std::fill_n(largest, lanes, -1.0);
  std::size_t k = 0;
  for (; k + lanes <= count; k += lanes)
    for (std::size_t l = 0; l < lanes; ++l) largest[l] = powers[k + l] > largest[l] ? powers[k + l] : largest[l];
  for (; k < count; ++k) largest[0] = std::max(largest[0], powers[k]);
  return *std::max_element(largest, largest + lanes);
}

double sum_of_squares(const double *x, std::size_t count) noexcept {
  double sum = 0;
  for (std::size_t k = 0; k < count; ++k) sum += x[k] * x[k];
  return sum;
}

}  // namespace

template <class Real>
void error_sums::add(std::span<const wide> carried, const std::complex<Real> *measured, const stream_model &model,
                     std::uint64_t position, double scale, const error_traces<Real> &traces) noexcept {
  if (carried.empty()) return;
  const std::size_t count = carried.size();
  const wide inverse_gain = 1.0 / model.gain;
  const double gain_re = inverse_gain.real(), gain_im = inverse_gain.imag();
  const double dc_re = model.dc.real(), dc_im = model.dc.imag();
  const auto *const u = reinterpret_cast<const double *>(carried.data());
  const auto *const m = reinterpret_cast<const Real *>(measured);
  planes errors, products;
  std::array<double, run> magnitudes, powers, angles;
  for (std::size_t k = 0; k < count; ++k) {
    const double u_re = u[2 * k], u_im = u[2 * k + 1];
    const double m_re = static_cast<double>(m[2 * k]) - dc_re, m_im = static_cast<double>(m[2 * k + 1]) - dc_im;
    const double z_re = m_re * gain_re - m_im * gain_im, z_im = m_re * gain_im + m_im * gain_re;
    errors.re[k] = (z_re - u_re) * scale;
    errors.im[k] = (z_im - u_im) * scale;
    magnitudes[k] = (std::sqrt(z_re * z_re + z_im * z_im) - std::sqrt(u_re * u_re + u_im * u_im)) * scale;
    products.re[k] = z_re * u_re + z_im * u_im;
    products.im[k] = z_im * u_re - z_re * u_im;
  }
  find_angles(products, count, angles.data());
  find_powers(errors, count, powers.data());
  double sum = 0;
  for (std::size_t k = 0; k < count; ++k) sum += powers[k];
  error += sum;
  peak.take(std::span(powers).first(count), sum, largest_of(powers.data(), count), position);
  magnitude += sum_of_squares(magnitudes.data(), count);
  phase += sum_of_squares(angles.data(), count);
  if (traces.error) {
    std::array<wide, run> turned;
    for (std::size_t k = 0; k < count; ++k) turned[k] = {errors.re[k], errors.im[k]};
    if (model.frequency != 0)
      rotate(std::span(turned).first(count), -model.frequency, static_cast<double>(position), 1, turned);
    for (std::size_t k = 0; k < count; ++k) traces.error[k] = std::complex<Real>(turned[k]);
  }
  if (traces.magnitude)
    for (std::size_t k = 0; k < count; ++k) traces.magnitude[k] = static_cast<Real>(magnitudes[k]);
  if (traces.phase)
    for (std::size_t k = 0; k < count; ++k) traces.phase[k] = static_cast<Real>(angles[k]);
}

void error_sums::add(const error_sums &next) noexcept {
  error += next.error;
  magnitude += next.magnitude;
  phase += next.phase;
  peak.take(next.peak.power, next.peak.position);
}

template <class Real>
block_sums block_comparison<Real>::compare(std::span<const sample> reference, std::span<const sample> measured,
                                           std::uint64_t position, const stretch &part,
                                           const error_traces<Real> &traces) {
  const qsrfhs::mkl_runtime::use in_use;
  delayed_.renew(reference);
  const stretch known = is_delayed() ? delayed_.known(model_.delay) : stretch{0, reference.size()};
  const stretch compared{std::max(part.first, known.first), std::min(part.last, known.last)};
  block_sums sums;
  // Times near 0 keep their digits in the squares.
  const double middle = static_cast<double>(part.first + part.last) / 2;
  delayed_.walk(compared, model_.delay, slopes_, [&](std::size_t first, auto values, auto derivatives) {
    std::array<wide, run> carried_room, sloped_room;
    const auto carry = [&](std::span<const wide> x, std::size_t at, std::span<wide> room) {
      if (model_.frequency == 0) return x;
      rotate(x, model_.frequency, static_cast<double>(position + at), 1, room);
      return std::span<const wide>(room).first(x.size());
    };
    for (std::size_t begin = 0; begin < values.size(); begin += run) {
      const std::size_t count = std::min(run, values.size() - begin), at = first + begin;
      const auto carried = carry(values.subspan(begin, count), at, carried_room);
      std::span<const wide> sloped;
      if (!derivatives.empty()) sloped = carry(derivatives.subspan(begin, count), at, sloped_room);
      sums.moments.add(carried, sloped, measured.data() + at, static_cast<double>(at) - middle);
      sums.errors.add(carried, measured.data() + at, model_, position + at, 1, traces.from(at));
    }
  });
  sums.moments = sums.moments.later(static_cast<double>(position) + middle);
  return sums;
}

template void error_sums::add(std::span<const wide>, const std::complex<float> *, const stream_model &, std::uint64_t,
                              double, const error_traces<float> &) noexcept;
template void error_sums::add(std::span<const wide>, const std::complex<double> *, const stream_model &, std::uint64_t,
                              double, const error_traces<double> &) noexcept;
template class block_comparison<float>;
template class block_comparison<double>;

}  // namespace dsp
