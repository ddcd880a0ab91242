// SPDX-License-Identifier: MIT
#include "signal/level_figures.hpp"

#include <algorithm>
#include <array>

#include "signal/block_transform.hpp"

namespace dsp {
namespace {

// Lanes are only indexed by constants, so that they stay in registers; the last few values go beside them.
constexpr std::size_t lanes = 8;
using lane_values = std::array<double, lanes>;

/// The sums of the numbers at even and at odd places.
template <class Real>
std::array<double, 2> alternating_sums(const Real *x, std::size_t n) noexcept {
  lane_values v{};
  std::size_t k = 0;
  for (; k + lanes <= n; k += lanes)
    for (std::size_t j = 0; j < lanes; ++j) v[j] += static_cast<double>(x[k + j]);
  double even = 0, odd = 0;
  for (; k < n; k += 2) {
    even += static_cast<double>(x[k]);
    if (k + 1 < n) odd += static_cast<double>(x[k + 1]);
  }
  return {((v[0] + v[4]) + (v[2] + v[6])) + even, ((v[1] + v[5]) + (v[3] + v[7])) + odd};
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
  // Pairs of lanes as compilers' vectors: they do not see minima and maxima of arrays as such.
  using pair = double __attribute__((vector_size(16)));
  constexpr std::size_t pairs = lanes / 2;
  const pair first = {power[0], power[0]};
  pair sums[pairs] = {}, smallest[pairs] = {first, first, first, first}, largest[pairs] = {first, first, first, first};
  std::size_t k = 0;
  for (; k + lanes <= n; k += lanes)
    for (std::size_t j = 0; j < pairs; ++j) {
      const pair p = {power[k + 2 * j], power[k + 2 * j + 1]};
      sums[j] += p;
      smallest[j] = p < smallest[j] ? p : smallest[j];
      largest[j] = p > largest[j] ? p : largest[j];
    }
  figures.smallest = figures.largest = power[0];
  for (std::size_t j = 0; j < lanes; ++j) {
    figures.smallest = std::min(figures.smallest, smallest[j / 2][j % 2]);
    figures.largest = std::max(figures.largest, largest[j / 2][j % 2]);
  }
  double rest = 0;
  for (; k < n; ++k) {
    rest += power[k];
    figures.smallest = std::min(figures.smallest, power[k]);
    figures.largest = std::max(figures.largest, power[k]);
  }
  const pair all = (sums[0] + sums[2]) + (sums[1] + sums[3]);
  figures.power = (all[0] + all[1]) + rest;
  return figures;
}

template run_figures measure_run(const float *, std::size_t, double *) noexcept;
template run_figures measure_run(const double *, std::size_t, double *) noexcept;
template run_figures measure_run(const std::complex<float> *, std::size_t, double *) noexcept;
template run_figures measure_run(const std::complex<double> *, std::size_t, double *) noexcept;

}  // namespace dsp
