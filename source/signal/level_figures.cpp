// SPDX-License-Identifier: MIT
#include "signal/level_figures.hpp"

#include <algorithm>
#include <array>

#include "signal/block_transform.hpp"

namespace dsp {
namespace {

constexpr std::size_t lanes = 8;
using lane_values = std::array<double, lanes>;

double sum(const lane_values &v) noexcept {
  return ((v[0] + v[4]) + (v[2] + v[6])) + ((v[1] + v[5]) + (v[3] + v[7]));
}

/// The sums of the numbers at even and at odd places.
template <class Real>
std::array<double, 2> alternating_sums(const Real *x, std::size_t n) noexcept {
  lane_values sums{};
  std::size_t k = 0;
  for (; k + lanes <= n; k += lanes)
    for (std::size_t j = 0; j < lanes; ++j) sums[j] += static_cast<double>(x[k + j]);
  for (std::size_t j = 0; k < n; ++j, ++k) sums[j] += static_cast<double>(x[k]);
  return {(sums[0] + sums[4]) + (sums[2] + sums[6]), (sums[1] + sums[5]) + (sums[3] + sums[7])};
}

}  // namespace

template <class Sample>
run_figures measure_run(const Sample *x, std::size_t n, double *__restrict power) noexcept {
  using real = real_of<Sample>;
  const auto *parts = reinterpret_cast<const real *>(x);
  run_figures figures;
  if constexpr (is_complex<Sample>) {
    for (std::size_t k = 0; k < n; ++k) {
      const auto re = static_cast<double>(parts[2 * k]), im = static_cast<double>(parts[2 * k + 1]);
      power[k] = re * re + im * im;
    }
    const auto dc = alternating_sums(parts, 2 * n);
    figures.dc_re = dc[0];
    figures.dc_im = dc[1];
  } else {
    for (std::size_t k = 0; k < n; ++k) power[k] = static_cast<double>(parts[k]) * static_cast<double>(parts[k]);
    const auto dc = alternating_sums(parts, n);
    figures.dc_re = dc[0] + dc[1];
  }
  lane_values sums{}, smallest, largest;
  smallest.fill(power[0]);
  largest.fill(power[0]);
  const auto take = [&](std::size_t j, double p) {
    sums[j] += p;
    smallest[j] = p < smallest[j] ? p : smallest[j];
    largest[j] = p > largest[j] ? p : largest[j];
  };
  std::size_t k = 0;
  for (; k + lanes <= n; k += lanes)
    for (std::size_t j = 0; j < lanes; ++j) take(j, power[k + j]);
  for (std::size_t j = 0; k < n; ++j, ++k) take(j, power[k]);
  figures.power = sum(sums);
  figures.smallest = *std::min_element(smallest.begin(), smallest.end());
  figures.largest = *std::max_element(largest.begin(), largest.end());
  return figures;
}

template run_figures measure_run(const float *, std::size_t, double *) noexcept;
template run_figures measure_run(const double *, std::size_t, double *) noexcept;
template run_figures measure_run(const std::complex<float> *, std::size_t, double *) noexcept;
template run_figures measure_run(const std::complex<double> *, std::size_t, double *) noexcept;

}  // namespace dsp
