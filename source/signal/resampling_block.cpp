// SPDX-License-Identifier: MIT
#include "signal/resampling_block.hpp"

#include <bit>
#include <cmath>
#include <cstring>
#include <initializer_list>
#include <numbers>
#include <utility>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "signal/block_transform.hpp"
#include "signal/convolution_method.hpp"
#include "signal/filter_design.hpp"

namespace dsp {
namespace {

/// Nanoseconds for a point of a complex transform in single precision, as open_resampler_bench measures them. Other
/// types take about the same multiples of these everywhere.
double point_cost(std::size_t points) noexcept {
  // Between powers of two from 2^8 on, for the caches and for MKL's codes.
  static constexpr double by_size[] = {0.5, 0.5, 0.53, 0.63, 0.8, 1.2, 1.35, 1.55, 1.75, 3.6};
  static constexpr double by_twos[] = {3.0, 2.3, 1.7, 1.35, 1.2};  // few factors of 2
  constexpr double large_prime = 6, middling_prime = 1.5;
  const double size = std::clamp(std::log2(static_cast<double>(points)) - 8, 0.0, 8.99);
  const auto below = static_cast<std::size_t>(size);
  const double cost = by_size[below] + (size - static_cast<double>(below)) * (by_size[below + 1] - by_size[below]);
  const auto twos = static_cast<std::size_t>(std::countr_zero(points));
  std::size_t rest = points >> twos;
  const auto divide_by = [&rest](std::initializer_list<unsigned> primes) {
    for (const unsigned prime : primes)
      while (rest % prime == 0) rest /= prime;
  };
  divide_by({3, 5, 7});
  const bool is_smooth = rest == 1;
  divide_by({11, 13});
  if (rest != 1) return cost * large_prime;
  return cost * (is_smooth ? 1 : middling_prime) * (twos < std::size(by_twos) ? by_twos[twos] : 1);
}

/// In inputs, of the low pass to either side.
double half_length(const lowpass_band &band) noexcept {
  return kaiser_formulas(band.attenuation).width / (band.stop - band.pass) / 2;
}

/// Bins from 0 on that are kept: those in front of the stop edge, and of half of both rates.
std::size_t kept_bins(const block_design &design) noexcept {
  const double edge = design.band.stop * static_cast<double>(design.inputs());
  const double half = static_cast<double>(std::min(design.inputs(), design.outputs())) / 2;
  return static_cast<std::size_t>(std::ceil(std::min(edge, half)));
}

/// Steps and costs of a design whose units are chosen; false where the filter leaves no outputs.
bool complete(block_design &design) noexcept {
  constexpr double copied = 0.25, multiplied = 0.4;  // nanoseconds for a point or bin
  const double half = half_length(design.band), inputs = static_cast<double>(design.inputs());
  const double unit = static_cast<double>(design.down), spacing = unit / static_cast<double>(design.up);
  const double free = inputs - 1 - std::floor(half) - half + spacing;
  if (free < unit) return false;
  design.step = static_cast<std::size_t>(free / unit);
  design.guard = static_cast<std::size_t>(half);
  const double outputs = static_cast<double>(design.outputs());
  const double block = inputs * (point_cost(design.inputs()) + copied) +
                       outputs * (point_cost(design.outputs()) + copied) +
                       2 * multiplied * static_cast<double>(kept_bins(design));
  design.cost = block / (static_cast<double>(design.step) * unit);
  return true;
}

dfti_descriptor in_place(std::size_t points, DFTI_CONFIG_VALUE precision, DFTI_CONFIG_VALUE domain) {
  return dfti_descriptor(dfti_settings{
      .precision = precision, .domain = domain, .lengths = {static_cast<MKL_LONG>(points), 0}, .in_place = true});
}
template <class Sample>
dfti_descriptor in_place(std::size_t points) {
  const qsrfhs::mkl_runtime::use in_use;
  return in_place(points, sizeof(real_of<Sample>) == sizeof(double) ? DFTI_DOUBLE : DFTI_SINGLE,
                  is_complex<Sample> ? DFTI_COMPLEX : DFTI_REAL);
}

/// Of spectra as their transforms have them.
template <class Sample>
std::size_t bins_of(std::size_t points) noexcept {
  return is_complex<Sample> ? points : points / 2 + 1;
}

}  // namespace

std::optional<block_design> design_block(std::size_t up, std::size_t down, const lowpass_band &band, double spare) {
  constexpr double near_the_cheapest = 1.05;
  const std::size_t most_units = longest_resampling_block / std::max(up, down);
  std::optional<block_design> cheapest, shortest;
  const auto visit = [&](auto accept) {
    for (const std::size_t odd : {1U, 3U, 5U, 7U, 9U, 15U})
      for (std::size_t units = odd; units <= most_units; units *= 2) {
        block_design design{up, down, units, 0, 0, band, 0};
        if (complete(design)) accept(design);
      }
  };
  visit([&](const block_design &design) {
    if (!cheapest || design.cost < cheapest->cost) cheapest = design;
  });
  visit([&](const block_design &design) {
    const double most = std::max(near_the_cheapest * cheapest->cost, cheapest->cost + spare);
    if (design.cost <= most && (!shortest || design.units < shortest->units)) shortest = design;
  });
  return shortest;
}

/// By a transform of the filter's taps: an integral for each bin, as band_filter has it for centres between bins, would
/// take two to seven times as long.
template <class Sample>
qsrfhs::aligned_buffer<std::complex<real_of<Sample>>> make_response(const block_design &design) {
  constexpr double points_a_stop_edge = 8;  // so that the sampled filter folds nothing that counts
  const double inputs = static_cast<double>(design.inputs());
  const double half = half_length(design.band);
  const auto points =
      std::bit_ceil(static_cast<std::size_t>(points_a_stop_edge * std::max(1.0, design.band.stop * inputs)));
  const double spacing = inputs / static_cast<double>(points);
  const kaiser_lowpass_response h(design.band.pass + design.band.stop, kaiser_formulas(design.band.attenuation).beta);
  const qsrfhs::mkl_runtime::use in_use;
  const block_transform<double> transform(points);
  qsrfhs::aligned_buffer<double> taps(points);
  std::fill_n(taps.data(), points, 0.0);
  taps.data()[0] = h(0, half);
  for (std::size_t k = 1; static_cast<double>(k) * spacing <= half && 2 * k < points; ++k)
    taps.data()[k] = taps.data()[points - k] = h(static_cast<double>(k) * spacing, half);
  qsrfhs::aligned_buffer<std::complex<double>> gains(transform.bins());
  transform.forward(taps.data(), gains.data());

  using real = real_of<Sample>;
  const std::size_t kept = kept_bins(design);
  qsrfhs::aligned_buffer<std::complex<real>> response(is_complex<Sample> ? 2 * kept - 1 : kept);
  const double scale = 1 / (gains.data()[0].real() * inputs);
  for (std::size_t k = 0; k < kept; ++k) {
    const auto turned = static_cast<double>(k * design.guard % design.inputs()) / inputs;
    const auto gain = std::polar(scale, 2 * std::numbers::pi * turned) * gains.data()[k].real();
    response.data()[k] = std::complex<real>(gain);
    if (is_complex<Sample> && k > 0) response.data()[2 * kept - 1 - k] = std::complex<real>(std::conj(gain));
  }
  return response;
}

template <class Sample>
std::size_t block_resampler<Sample>::lead_of(const block_design &design, std::int64_t first_input) noexcept {
  return (static_cast<std::size_t>(-first_input) + design.guard) / design.down + 1;
}

template <class Sample>
block_resampler<Sample>::block_resampler(const block_design &design, response kept, std::int64_t first_input,
                                         std::size_t lead)
    : design_(design),
      response_(std::move(kept)),
      first_input_(first_input),
      origin_(-static_cast<std::int64_t>(lead * design.down + design.guard)),
      first_output_(-static_cast<std::int64_t>(lead * design.up)),
      forward_(in_place<Sample>(design.inputs())),
      backward_(in_place<Sample>(design.outputs())),
      work_(bins_of<Sample>(std::max(design.inputs(), design.outputs()))),
      line_(design.inputs()) {
  reset();
}

template <class Sample>
std::int64_t block_resampler<Sample>::blocks(std::int64_t end) const noexcept {
  const auto length = static_cast<std::int64_t>(design_.inputs()), step = static_cast<std::int64_t>(design_.step);
  const std::int64_t rest = end - origin_ - length;
  return rest < 0 ? 0 : rest / (step * static_cast<std::int64_t>(design_.down)) + 1;
}

template <class Sample>
std::int64_t block_resampler<Sample>::outputs_end(std::int64_t end) const noexcept {
  return first_output_ + blocks(end) * static_cast<std::int64_t>(design_.step * design_.up);
}

template <class Sample>
std::int64_t block_resampler<Sample>::reach(std::int64_t end) const noexcept {
  const auto units = (end + static_cast<std::int64_t>(design_.guard)) / static_cast<std::int64_t>(design_.down) + 1;
  return units * static_cast<std::int64_t>(design_.up);
}

template <class Sample>
void block_resampler<Sample>::reset() noexcept {
  const auto silence = restore(first_input_);
  std::fill(silence.begin(), silence.end(), Sample{});
}

template <class Sample>
std::span<Sample> block_resampler<Sample>::restore(std::int64_t end) noexcept {
  const std::int64_t begin = origin_ + blocks(end) * static_cast<std::int64_t>(design_.step * design_.down);
  early_ = begin > end ? static_cast<std::size_t>(begin - end) : 0;
  held_ = begin < end ? static_cast<std::size_t>(end - begin) : 0;
  return line_.elements().first(held_);
}

template <class Sample>
std::span<const Sample> block_resampler<Sample>::run(std::span<const Sample> fresh) {
  const std::size_t inputs = design_.inputs(), outputs = design_.outputs();
  auto *const samples = reinterpret_cast<Sample *>(work_.data());
  std::copy(fresh.begin(), fresh.end(), std::copy_n(line_.data(), held_, samples));
  held_ = inputs - design_.step * design_.down;
  std::copy_n(samples + inputs - held_, held_, line_.data());

  const qsrfhs::mkl_runtime::use in_use;
  bin *const bins = work_.data();
  forward_.forward(bins);
  if constexpr (is_complex<Sample>) {
    const std::size_t kept = (response_->size() + 1) / 2, negative = kept - 1;
    multiply_bins(bins, response_->data(), kept);
    multiply_bins(bins + inputs - negative, response_->data() + kept, negative);
    std::memmove(bins + outputs - negative, bins + inputs - negative, negative * sizeof(bin));
    std::fill(bins + kept, bins + outputs - negative, bin{});
  } else {
    multiply_bins(bins, response_->data(), response_->size());
    std::fill(bins + response_->size(), bins + bins_of<Sample>(outputs), bin{});
  }
  backward_.backward(bins);
  return {samples, design_.step * design_.up};
}

#define INSTANTIATE(SAMPLE)                                                                                         \
  template qsrfhs::aligned_buffer<std::complex<real_of<SAMPLE>>> make_response<SAMPLE>(const block_design &design); \
  template class block_resampler<SAMPLE>
INSTANTIATE(float);
INSTANTIATE(double);
INSTANTIATE(std::complex<float>);
INSTANTIATE(std::complex<double>);
#undef INSTANTIATE

}  // namespace dsp
