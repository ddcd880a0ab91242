// SPDX-License-Identifier: MIT
#include "analysis/averaged_spectrum.hpp"

#include <algorithm>
#include <cmath>
#include <complex>

#include "recording/sample_reader.hpp"
#include "terminal/failure.hpp"
#include "terminal/progress.hpp"

namespace tool {
namespace {

/// Points that one call may transform, so that progress is seen with any overlap.
constexpr std::uint64_t points_per_call = std::uint64_t{1} << 25;

struct window_figures {
  double gain;             // mean coefficient
  double noise_bandwidth;  // N * sum(w^2) / sum(w)^2
};

/// Sums over whole periods of cosines in closed form: N * a0, and N * (a0^2 + (a1^2 + ... ) / 2).
window_figures figures_of(lumra::window window) {
  if (window == lumra::window::none) return {1.0, 1.0};
  constexpr double a[] = {0.21557895, 0.41663158, 0.277263158, 0.083578947, 0.006947368};
  double squares = a[0] * a[0];
  for (std::size_t i = 1; i < std::size(a); ++i) squares += a[i] * a[i] / 2;
  return {a[0], squares / (a[0] * a[0])};
}

}  // namespace

double decibels(double power) noexcept {
  return 10 * std::log10(std::max(power, 1e-30));
}

averaged_spectrum average_spectrum(const recording::source &source, const recording::stretch &over,
                                   const spectrum_settings &settings) {
  const auto n = static_cast<std::uint64_t>(settings.fft_size);
  // The same expression and truncation as the library's, so that the segments start at the same samples.
  const auto overlap = static_cast<std::uint64_t>(settings.overlap_percent / 100.0 * settings.fft_size);
  const std::uint64_t step = n - overlap;
  const std::uint64_t samples = over.samples;
  if (samples < n)
    throw failure("{}: {} samples are fewer than N = {}; use a smaller --fft", source.data.string(), samples, n);
  const std::uint64_t segments = (samples - n) / step + 1;

  const std::uint64_t fitting = settings.block > n ? (settings.block - n) / step + 1 : 1;
  const std::uint64_t per_call = std::min({segments, fitting, std::max<std::uint64_t>(points_per_call / n, 1)});

  lumra::session session;
  session.initialize_fft(settings.fft_size);
  session.initialize_window(settings.window, settings.fft_size);
  const window_figures figures = figures_of(settings.window);
  const double dt = 1.0 / source.rate;

  averaged_spectrum result;
  result.power.assign(n, 0.0);
  result.df = source.rate / static_cast<double>(n);
  result.noise_bandwidth = figures.noise_bandwidth;
  result.segments = segments;

  recording::sample_reader reader(source, over);
  progress bar("Analysing");
  lumra::host_array<std::complex<float>> block(n + (per_call - 1) * step);
  lumra::spectrum part;
  std::uint64_t kept = 0;  // samples at the front of the block that the call before has used too
  for (std::uint64_t done = 0; done < segments;) {
    const std::uint64_t count = std::min(per_call, segments - done);
    block.resize(n + (count - 1) * step);
    reader.read(block.elements().subspan(kept));
    session.power_spectrum(settings.window, settings.fft_size, settings.overlap_percent, block, dt, part);
    const auto weight = static_cast<double>(count);
    for (std::size_t k = 0; k < n; ++k) result.power[k] += weight * static_cast<double>(part.power.elements()[k]);
    const auto used = block.elements();
    std::copy(used.begin() + static_cast<std::ptrdiff_t>(count * step), used.end(), used.begin());
    kept = overlap;
    done += count;
    bar.update(done, segments);
  }
  const double amplitude = figures.gain * static_cast<double>(n);
  const double scale = 1 / (amplitude * amplitude * static_cast<double>(segments));
  for (double &power : result.power) {
    power *= scale;
    if (!std::isfinite(power))
      throw failure("{}: samples are too large for single precision; scale the recording down", source.data.string());
  }
  return result;
}

}  // namespace tool
