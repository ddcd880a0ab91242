// SPDX-License-Identifier: MIT
#include "signal/delayed_reference.hpp"

#include <numbers>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "signal/rotation.hpp"

namespace dsp {
namespace {

/// Where a record is cut, interpolation rings. A record with a free band at half the rate fades in and out before it is
/// transformed, where it is not relied on, and then rings no longer; one that fills its band to the edges rings
/// anyway, and is taken as periodic, which it may be.
bool fills_band(std::span<const std::complex<double>> spectrum) noexcept {
  constexpr double least_share = 0.01;  // a tenth is what white noise has there
  const std::size_t points = spectrum.size(), first = points * 45 / 100;
  double all = 0, at_edges = 0;
  for (std::size_t k = 0; k < points; ++k) {
    const double power = std::norm(spectrum[k]);
    all += power;
    if (k >= first && k < points - first) at_edges += power;
  }
  return at_edges > least_share * all;
}

void fade_ends(std::span<std::complex<double>> x) noexcept {
  const std::size_t faded = delayed_reference<std::complex<double>>::guard(x.size());
  for (std::size_t k = 0; k < faded; ++k) {
    const double s = std::sin(std::numbers::pi / 2 * (static_cast<double>(k) + 0.5) / static_cast<double>(faded));
    x[k] *= s * s;
    x[x.size() - 1 - k] *= s * s;
  }
}

}  // namespace

template <class Sample>
stretch delayed_reference<Sample>::known(double delay) const noexcept {
  const auto n = static_cast<double>(reference_.size()), skipped = static_cast<double>(guard(reference_.size()));
  const double first = std::clamp(std::ceil(skipped + delay), 0.0, n);
  const double last = std::clamp(n + std::floor(delay - skipped), first, n);
  return {static_cast<std::size_t>(first), static_cast<std::size_t>(last)};
}

template <class Sample>
void delayed_reference<Sample>::prepare(std::size_t points) {
  if (!transform_ || transform_->length() != points)
    transform_ = std::make_unique<block_transform<std::complex<double>>>(points);
  for (buffer *room : {&spectrum_, &turned_, &delayed_, &slopes_})
    if (room->size() < points) *room = buffer(points);
}

template <class Sample>
void delayed_reference<Sample>::load(const stretch &part) {
  stretch wanted{part.first - std::min(part.first, margin), std::min(part.last + margin, reference_.size())};
  if (2 * wanted.count() > reference_.size()) wanted = {0, reference_.size()};
  if (transform_ && wanted.first == window_.first && wanted.last == window_.last) return;
  const qsrfhs::mkl_runtime::use in_use;
  const std::size_t points = wanted.count();
  prepare(points);
  std::copy_n(reference_.data() + wanted.first, points, delayed_.data());
  transform_->forward(delayed_.data(), spectrum_.data());
  if (!fills_band({spectrum_.data(), points})) {
    fade_ends({delayed_.data(), points});
    transform_->forward(delayed_.data(), spectrum_.data());
  }
  window_ = wanted;
  shifted_ = std::numeric_limits<double>::quiet_NaN();
}

template <class Sample>
void delayed_reference<Sample>::shift(double delay, slopes wanted) {
  const qsrfhs::mkl_runtime::use in_use;
  const std::size_t points = window_.count(), half = (points + 1) / 2;
  const double turn = -delay / static_cast<double>(points), scale = 1 / static_cast<double>(points);
  const std::span<const std::complex<double>> bins(spectrum_.data(), points);
  const std::span<std::complex<double>> turned(turned_.data(), points);
  // Bins from 0 up, then the negative ones; half the rate is one of these.
  const std::size_t negative = points - half;
  rotate(bins.first(half), turn, 0, scale, turned.first(half));
  rotate(bins.last(negative), turn, -static_cast<double>(negative), scale, turned.last(negative));
  transform_->backward(turned.data(), delayed_.data());
  shifted_ = delay;
  if (wanted == slopes::left_out) return;
  const double step = -2 * std::numbers::pi / static_cast<double>(points);
  for (std::size_t k = 0; k < points; ++k) {
    const double bin = k < half ? static_cast<double>(k) : -static_cast<double>(points - k);
    turned[k] = {-turned[k].imag() * step * bin, turned[k].real() * step * bin};
  }
  transform_->backward(turned.data(), slopes_.data());
}

template class delayed_reference<std::complex<float>>;
template class delayed_reference<std::complex<double>>;

}  // namespace dsp
