// SPDX-License-Identifier: MIT
#include "analysis/resampling.hpp"

#include <algorithm>
#include <cmath>
#include <lumra/lumra.hpp>
#include <numbers>

#include "recording/sample_reader.hpp"
#include "terminal/failure.hpp"
#include "terminal/progress.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

using sample = std::complex<float>;

/// There are so many phases that the images of the linear interpolation lie below the stop band of the design.
constexpr std::int32_t phases = 128;
constexpr double pass_edge = 0.45, stop_edge = 0.5, attenuation = 90;
/// Points of the measured response: some sixteen to a side lobe.
constexpr std::int32_t points = 1 << 18;
/// Outputs that one call may give, roughly.
constexpr std::uint64_t outputs_per_call = std::uint64_t{1} << 18;
/// The largest factor between the rates, up or down.
constexpr double largest_ratio = 65536;

float ratio_between(const recording::source &source, double rate) {
  const double ratio = source.rate / rate;
  if (!(ratio <= largest_ratio && ratio >= 1 / largest_ratio))
    throw failure("{}: from {} to {} is beyond a factor of {:g}; resample in several steps", source.data.string(),
                  exact_text(source.rate), exact_text(rate), largest_ratio);
  return static_cast<float>(ratio);
}

double sinc(double x) {
  return x == 0 ? 1 : std::sin(std::numbers::pi * x) / (std::numbers::pi * x);
}

/// Interpolating linearly multiplies the response, periodic in `phases`, by a squared sinc with zeros at its periods.
/// The images around the first of them are the strongest.
void measure(resampling_filter &filter) {
  lumra::plan<float> plan;
  const auto response = lumra::fft(plan, filter.coefficients, points);
  const auto gain = [&](std::int32_t k) {  // at k * phases / points
    const std::int32_t folded = std::min(k, points - k);
    const double shape = sinc(static_cast<double>(k) / points);
    return static_cast<double>(std::abs(response[static_cast<std::size_t>(folded)])) * shape * shape;
  };
  const double pass = pass_edge * points / phases, stop = stop_edge * points / phases;
  for (std::int32_t k = 0; k <= pass; ++k) filter.ripple = std::max(filter.ripple, std::abs(gain(k) - 1));
  for (auto k = static_cast<std::int32_t>(std::ceil(stop)); k <= points; ++k)
    filter.rejection = std::max(filter.rejection, gain(k));
}

resampling_filter design() {
  const auto kaiser = lumra::registered_filter::kaiser_low_pass(phases, pass_edge, stop_edge, attenuation);
  resampling_filter filter{{kaiser.coefficients().begin(), kaiser.coefficients().end()}, phases, pass_edge, stop_edge};
  double sum = 0;
  for (const float h : filter.coefficients) sum += static_cast<double>(h);
  for (float &h : filter.coefficients) h = static_cast<float>(static_cast<double>(h) / sum);
  measure(filter);
  return filter;
}

}  // namespace

resampling::resampling(const recording::source &source, const recording::stretch &over, double wanted_rate)
    : source_(source),
      over_(over),
      ratio_(ratio_between(source, wanted_rate)),
      rate_(source.rate / wanted_rate == ratio() ? wanted_rate : source.rate / ratio()),
      filter_(design()) {}

std::uint64_t resampling::samples() const noexcept {
  // This is exact up to 2^39 outputs: the ratio has 24 bits, a quotient that is not whole is 2^-24 or more away from
  // a whole one.
  return static_cast<std::uint64_t>(
      std::ceil(static_cast<long double>(over_.samples) / static_cast<long double>(ratio_)));
}

void resampling::run(std::uint64_t block, const std::function<void(std::span<const sample>)> &write) const {
  const std::uint64_t available = over_.samples;
  const std::uint64_t wanted = samples();
  const auto fitting = static_cast<std::uint64_t>(static_cast<double>(outputs_per_call) * ratio());
  const std::uint64_t per_call = std::clamp<std::uint64_t>(fitting, 1, block);

  // The last output needs so many zeros behind the recording.
  const double reach = static_cast<double>(filter_.coefficients.size() - 1) / (2 * filter_.phases);
  const auto behind = static_cast<std::uint64_t>(reach * std::max(ratio(), 1.0)) + 1;

  lumra::resampler<sample> resampler(filter_.coefficients, filter_.phases, {.ratio = ratio_});
  recording::sample_reader reader(source_, over_);
  progress bar("Resampling");
  std::vector<sample> in;
  std::uint64_t read = 0, written = 0;
  while (written < wanted) {
    if (read < available) {
      in.resize(std::min(per_call, available - read));
      reader.read(in);
      read += in.size();
    } else {
      in.assign(std::min(per_call, behind), sample());
    }
    std::span<const sample> out = resampler(in);
    out = out.first(static_cast<std::size_t>(std::min<std::uint64_t>(out.size(), wanted - written)));
    if (!std::all_of(out.begin(), out.end(),
                     [](const sample &x) { return std::isfinite(x.real()) && std::isfinite(x.imag()); }))
      throw failure("{}: samples are too large for single precision; scale the recording down", source_.data.string());
    if (!out.empty()) write(out);
    written += out.size();
    bar.update(written, wanted);
  }
}

}  // namespace tool
