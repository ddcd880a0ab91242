// SPDX-License-Identifier: MIT
#include "signal/error_vectors.hpp"

#include <mkl_vml.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "signal/rotation.hpp"

namespace dsp {
namespace {

using wide = std::complex<double>;

constexpr std::size_t run = 512;

double power(wide v) noexcept {
  return v.real() * v.real() + v.imag() * v.imag();
}

/// Calls visit(first, carried) run by run over the part: the reference as the model delays it, on the model's carrier.
template <class Sample, class Visit>
void walk_carried(delayed_reference<Sample> &reference, const stretch &part, const stream_model &model, Visit visit) {
  reference.walk(part, model.delay, slopes::left_out, [&](std::size_t first, std::span<const wide> values, auto) {
    std::array<wide, run> room;
    for (std::size_t begin = 0; begin < values.size(); begin += run) {
      const auto delayed = values.subspan(begin, std::min(run, values.size() - begin));
      std::span<const wide> carried = delayed;
      if (model.frequency != 0) {
        rotate(delayed, model.frequency, static_cast<double>(first + begin), 1, room);
        carried = {room.data(), delayed.size()};
      }
      visit(first + begin, carried);
    }
  });
}

/// Sums over all that is compared, from which gain, dc and correlation follow.
struct moments {
  double reference = 0, measured = 0;  // powers
  wide product = 0;                    // of the measured and the conjugated reference
  wide reference_dc = 0, measured_dc = 0;

  void add(wide u, wide m) noexcept {
    reference += power(u);
    measured += power(m);
    product += times(m, std::conj(u));
    reference_dc += u;
    measured_dc += m;
  }
  void add(const moments &other) noexcept {
    reference += other.reference;
    measured += other.measured;
    product += other.product;
    reference_dc += other.reference_dc;
    measured_dc += other.measured_dc;
  }
  /// What is left without the direct parts.
  [[nodiscard]] moments centred(double count) const noexcept {
    moments rest = *this;
    rest.reference -= power(reference_dc) / count;
    rest.measured -= power(measured_dc) / count;
    rest.product -= times(measured_dc, std::conj(reference_dc)) / count;
    return rest;
  }
};

/// Sets gain and dc of the model, and the reference's RMS.
error_outcome fit(const moments &all, const alignment &wanted, error_figures &figures) {
  // Errors of ten times the reference, or a correlation that one of so many trials finds in unrelated noise.
  constexpr double least = 0.01, for_search = 20, most = 0.5;
  constexpr double no_variation = 1e-12;
  const auto count = static_cast<double>(figures.compared.count());
  if (all.reference == 0) return error_outcome::silent_reference;
  figures.reference_rms = std::sqrt(all.reference / count);
  const moments rest = wanted.dc ? all.centred(count) : all;
  if (wanted.gain || wanted.searched()) {
    if (rest.reference <= no_variation * all.reference) return error_outcome::undetermined;
    const double correlation = power(rest.product) / rest.reference / rest.measured;
    const double threshold = wanted.searched() ? std::min(least + for_search / count, most) : least;
    if (!(correlation >= threshold)) return error_outcome::unrelated;
  }
  if (wanted.gain) figures.model.gain = rest.product / rest.reference;
  if (wanted.dc) figures.model.dc = (all.measured_dc - times(figures.model.gain, all.reference_dc)) / count;
  return error_outcome::measured;
}

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

template <class Real>
void fill_ends(Real *trace, std::size_t n, const stretch &compared, Real value) noexcept {
  if (!trace) return;
  std::fill_n(trace, compared.first, value);
  std::fill(trace + compared.last, trace + n, value);
}

template <class Real>
void measure_model(delayed_reference<std::complex<Real>> &delayed, std::span<const std::complex<Real>> measured,
                   const error_traces<Real> &traces, error_figures &figures) {
  const stream_model &model = figures.model;
  const wide inverse_gain = 1.0 / model.gain;
  const double scale = 1 / figures.reference_rms;
  double error_power = 0, magnitude_power = 0, phase_power = 0;
  walk_carried(delayed, figures.compared, model, [&](std::size_t first, std::span<const wide> carried) {
    std::array<wide, run> errors, products;
    std::array<double, run> magnitudes, angles;
    const std::size_t count = carried.size();
    for (std::size_t k = 0; k < count; ++k) {
      const wide z = times(wide(measured[first + k]) - model.dc, inverse_gain), u = carried[k];
      errors[k] = (z - u) * scale;
      magnitudes[k] = (std::sqrt(power(z)) - std::sqrt(power(u))) * scale;
      products[k] = times(z, std::conj(u));
    }
    find_angles({products.data(), count}, angles.data());
    double sums[3] = {};
    for (std::size_t k = 0; k < count; ++k) {
      const double p = power(errors[k]);
      figures.peak.take(p, first + k);
      sums[0] += p;
      sums[1] += magnitudes[k] * magnitudes[k];
      sums[2] += angles[k] * angles[k];
    }
    error_power += sums[0];
    magnitude_power += sums[1];
    phase_power += sums[2];
    if (traces.error) {
      if (model.frequency != 0)
        rotate(std::span(errors).first(count), -model.frequency, static_cast<double>(first), 1, errors);
      for (std::size_t k = 0; k < count; ++k) traces.error[first + k] = std::complex<Real>(errors[k]);
    }
    if (traces.magnitude)
      for (std::size_t k = 0; k < count; ++k) traces.magnitude[first + k] = static_cast<Real>(magnitudes[k]);
    if (traces.phase)
      for (std::size_t k = 0; k < count; ++k) traces.phase[first + k] = static_cast<Real>(angles[k]);
  });
  const auto count = static_cast<double>(figures.compared.count());
  figures.rms = std::sqrt(error_power / count);
  figures.magnitude_rms = std::sqrt(magnitude_power / count);
  figures.phase_rms = std::sqrt(phase_power / count);
  constexpr Real nan = std::numeric_limits<Real>::quiet_NaN();
  fill_ends(traces.error, measured.size(), figures.compared, std::complex<Real>(nan, nan));
  fill_ends(traces.magnitude, measured.size(), figures.compared, nan);
  fill_ends(traces.phase, measured.size(), figures.compared, nan);
}

}  // namespace

template <class Real>
error_outcome measure_errors(std::span<const std::complex<Real>> reference,
                             std::span<const std::complex<Real>> measured, const alignment &wanted,
                             const error_traces<Real> &traces, error_figures &figures) {
  using sample = std::complex<Real>;
  if (std::all_of(reference.begin(), reference.end(), [](const sample &v) { return v == Real(0); }))
    return error_outcome::silent_reference;
  const qsrfhs::mkl_runtime::use in_use;
  delayed_reference<sample> delayed(reference);
  if (wanted.searched()) {
    const alignment_outcome outcome = find_delay_and_frequency(reference, measured, wanted, delayed, figures.model);
    if (outcome == alignment_outcome::unrelated) return error_outcome::unrelated;
    if (outcome == alignment_outcome::undetermined) return error_outcome::undetermined;
  }
  figures.compared = wanted.delay ? delayed.known(figures.model.delay) : stretch{0, reference.size()};
  moments all;
  walk_carried(delayed, figures.compared, figures.model, [&](std::size_t first, std::span<const wide> carried) {
    moments here;
    for (std::size_t k = 0; k < carried.size(); ++k) here.add(carried[k], wide(measured[first + k]));
    all.add(here);
  });
  const error_outcome outcome = fit(all, wanted, figures);
  if (outcome == error_outcome::measured) measure_model(delayed, measured, traces, figures);
  return outcome;
}

template error_outcome measure_errors(std::span<const std::complex<float>>, std::span<const std::complex<float>>,
                                      const alignment &, const error_traces<float> &, error_figures &);
template error_outcome measure_errors(std::span<const std::complex<double>>, std::span<const std::complex<double>>,
                                      const alignment &, const error_traces<double> &, error_figures &);

}  // namespace dsp
