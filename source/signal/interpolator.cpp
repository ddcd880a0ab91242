// SPDX-License-Identifier: MIT
#include "signal/interpolator.hpp"

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <complex>
#include <numbers>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "signal/filter_design.hpp"

namespace dsp {
namespace {

constexpr std::size_t block = 1024;           // inputs that are taken at once, and stay in the first-level cache
constexpr std::size_t most_places = 64;       // outputs that are computed at once
constexpr double transition = 0.5;            // in cycles per input sample: a quarter to three quarters
constexpr double margin = 6;                  // dB, for several images that add up and for the errors of the pieces
constexpr double least_rejection = 66;        // dB, for pass bands that are flat within 0.01 dB
constexpr std::size_t coefficient_count = 4;  // of a polynomial

template <class Sample>
constexpr std::size_t values_per_sample = is_complex<Sample> ? 2 : 1;
template <class Sample>
constexpr std::size_t lanes = 32 / sizeof(real_of<Sample>);

/// Even, and whole registers.
template <class Sample>
std::size_t tap_count(double rejection) noexcept {
  const double needed = kaiser_formulas(std::max(rejection, least_rejection) + margin).width / transition;
  constexpr std::size_t group = lanes<Sample> / values_per_sample<Sample>;
  return (static_cast<std::size_t>(std::ceil(needed)) + group - 1) / group * group;
}

/// The attenuation for which that many taps have the transition.
double attenuation_of(std::size_t taps) noexcept {
  constexpr double slope = 14.36, offset = 7.95;  // of Kaiser's formula for the width
  return slope * transition * static_cast<double>(taps) + offset;
}

/// Pieces of a sample. A cubic polynomial misses a tone of half a cycle a sample by pi^4 / (3072 pieces^4) at most; the
/// filter's taps together by a little more than that.
std::size_t piece_count(double rejection) noexcept {
  constexpr double fourth_derivative = 97.4 * 4;
  const double fourth_power =
      fourth_derivative / 3072 * std::pow(10, (std::max(rejection, least_rejection) + margin) / 20);
  return std::bit_ceil(static_cast<std::size_t>(std::ceil(std::pow(fourth_power, 0.25))));
}

/// The polynomial through f at the four best places of -1/2 to 1/2, the highest power first.
template <class Function>
std::array<double, coefficient_count> fit_cubic(Function f) noexcept {
  // Chebyshev's expansion in x = 2 u, then the powers of u.
  std::array<double, coefficient_count> c{};
  for (std::size_t j = 0; j < coefficient_count; ++j) {
    const double angle = std::numbers::pi * (static_cast<double>(j) + 0.5) / coefficient_count;
    const double y = f(std::cos(angle) / 2) * 2 / coefficient_count;
    for (std::size_t k = 0; k < coefficient_count; ++k) c[k] += y * std::cos(static_cast<double>(k) * angle);
  }
  c[0] /= 2;
  return {32 * c[3], 8 * c[2], 2 * c[1] - 6 * c[3], c[0] - c[2]};
}

void interpolate(const qsrfhs::kernels::sample_place<float> *places, std::size_t outputs,
                 const qsrfhs::kernels::cubic_taps<float> &taps, std::size_t width, const float *x,
                 float *out) noexcept {
  qsrfhs::kernels::fused().interpolate(places, outputs, taps, width, x, out);
}
void interpolate(const qsrfhs::kernels::sample_place<double> *places, std::size_t outputs,
                 const qsrfhs::kernels::cubic_taps<double> &taps, std::size_t width, const double *x,
                 double *out) noexcept {
  qsrfhs::kernels::fused().interpolate_double(places, outputs, taps, width, x, out);
}

}  // namespace

template <class Sample>
interpolator<Sample>::interpolator(const rate_ratio &ratio, double rejection)
    : ratio_(ratio),
      taps_(tap_count<Sample>(rejection)),
      pieces_(piece_count(rejection)),
      coefficients_(pieces_ * coefficient_count * taps_ * values_per_sample<Sample>),
      line_(taps_ - 1, block) {
  const double half = static_cast<double>(taps_) / 2, count = static_cast<double>(pieces_);
  const kaiser_lowpass_response h(2 * transition, kaiser_formulas(attenuation_of(taps_)).beta);
  constexpr std::size_t width = values_per_sample<Sample>, group = lanes<Sample>;
  for (std::size_t piece = 0; piece < pieces_; ++piece) {
    for (std::size_t tap = 0; tap < taps_; ++tap) {
      const double distance = (static_cast<double>(piece) + 0.5) / count + half - 1 - static_cast<double>(tap);
      const auto fit = fit_cubic([&](double u) { return h(distance + u / count, half); });
      for (std::size_t value = width * tap; value < width * (tap + 1); ++value)
        for (std::size_t power = 0; power < coefficient_count; ++power)
          coefficients_.data()[((piece * width * taps_ / group + value / group) * coefficient_count + power) * group +
                               value % group] = static_cast<real>(fit[power]);
    }
  }
}

template <class Sample>
void interpolator<Sample>::process(std::span<const Sample> in, std::span<Sample> out) noexcept {
  const qsrfhs::kernels::cubic_taps<real> taps{coefficients_.data(), values_per_sample<Sample> * taps_};
  const auto pieces = static_cast<double>(pieces_);
  const auto last_piece = static_cast<std::int32_t>(pieces_ - 1);
  const rate_ratio ratio = ratio_;
  stream_position next = next_;
  std::array<qsrfhs::kernels::sample_place<real>, most_places> places;
  while (!in.empty()) {
    const auto part = in.first(std::min(in.size(), block));
    const Sample *const oldest = line_.append(part) - (taps_ - 1);
    // The samples of an output begin half the taps in front of it, and that is so many behind `oldest`:
    const std::uint64_t behind = taps_ / 2 - inputs_;
    inputs_ += part.size();
    while (!out.empty() && next.whole + taps_ / 2 < inputs_) {
      const std::size_t most = std::min(most_places, out.size());
      std::size_t count = 0;
      for (; count < most && next.whole + taps_ / 2 < inputs_; ++count) {
        const double place = ratio.fraction(next) * pieces;
        const std::int32_t piece = std::min(static_cast<std::int32_t>(place), last_piece);
        places[count] = {static_cast<std::uint32_t>(next.whole + behind), static_cast<std::uint32_t>(piece),
                         static_cast<real>(place - piece - 0.5)};
        ratio.advance(next);
      }
      interpolate(places.data(), count, taps, values_per_sample<Sample>, reinterpret_cast<const real *>(oldest),
                  reinterpret_cast<real *>(out.data()));
      out = out.subspan(count);
    }
    in = in.subspan(part.size());
  }
  next_ = next;
}

template <class Sample>
void interpolator<Sample>::reset() noexcept {
  line_.clear();
  inputs_ = 0;
  next_ = {0, 0};
}

template <class Sample>
void interpolator<Sample>::set_past(std::uint64_t inputs, std::span<const Sample> samples) noexcept {
  line_.set_past(samples);
  inputs_ = inputs;
  next_ = ratio_.position(static_cast<std::uint64_t>(outputs(inputs)));
}

template class interpolator<float>;
template class interpolator<double>;
template class interpolator<std::complex<float>>;
template class interpolator<std::complex<double>>;

}  // namespace dsp
