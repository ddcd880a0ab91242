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

/// Angles of a run of products, those of 0 being 0.
void find_angles(std::span<const wide> products, double *angles) noexcept {
  std::array<double, run> re, im;
  for (std::size_t k = 0; k < products.size(); ++k) {
    const bool none = products[k] == 0.0;
    re[k] = none ? 1 : products[k].real();
    im[k] = none ? 0 : products[k].imag();
  }
  vmdAtan2(static_cast<MKL_INT>(products.size()), im.data(), re.data(), angles, VML_HA);
}

}  // namespace

template <class Real>
void error_sums::add(std::span<const wide> carried, const std::complex<Real> *measured, const stream_model &model,
                     std::uint64_t position, double scale, const error_traces<Real> &traces) noexcept {
  if (carried.empty()) return;
  const wide inverse_gain = 1.0 / model.gain;
  std::array<wide, run> errors, products;
  std::array<double, run> magnitudes, angles;
  const std::size_t count = carried.size();
  for (std::size_t k = 0; k < count; ++k) {
    const wide z = times(wide(measured[k]) - model.dc, inverse_gain), u = carried[k];
    errors[k] = (z - u) * scale;
    magnitudes[k] = (std::sqrt(std::norm(z)) - std::sqrt(std::norm(u))) * scale;
    products[k] = times(z, std::conj(u));
  }
  find_angles({products.data(), count}, angles.data());
  double sums[3] = {};
  for (std::size_t k = 0; k < count; ++k) {
    const double p = std::norm(errors[k]);
    peak.take(p, position + k);
    sums[0] += p;
    sums[1] += magnitudes[k] * magnitudes[k];
    sums[2] += angles[k] * angles[k];
  }
  error += sums[0];
  magnitude += sums[1];
  phase += sums[2];
  if (traces.error) {
    if (model.frequency != 0)
      rotate(std::span(errors).first(count), -model.frequency, static_cast<double>(position), 1, errors);
    for (std::size_t k = 0; k < count; ++k) traces.error[k] = std::complex<Real>(errors[k]);
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
