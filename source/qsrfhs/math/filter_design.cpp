// SPDX-License-Identifier: MIT
#include "qsrfhs/math/filter_design.hpp"

#include <algorithm>
#include <cmath>
#include <numbers>

#include "host/host_array.hpp"
#include "signal/bessel.hpp"

namespace qsrfhs {
namespace {

using dsp::bessel_i0;

constexpr double pi = std::numbers::pi;

double sinc(double x) noexcept {
  return x == 0 ? 1 : std::sin(pi * x) / (pi * x);
}

/// A symmetric filter: h(t) for the distances t from its middle, of which each is computed once.
template <class Response>
std::unique_ptr<Filter> symmetric(double length, std::uint64_t count, Response h) {
  const double wanted = count != 0 ? static_cast<double>(count) : length;
  if (!(wanted >= 1 && wanted <= longest_design)) return nullptr;
  const auto n = static_cast<std::size_t>(wanted);
  auto filter = std::make_unique<Filter>(n, 0.F);
  const auto coefficients = filter->coefficients();
  const double middle = static_cast<double>(n - 1) / 2;
  for (std::size_t k = 0; 2 * k < n; ++k)
    coefficients[k] = coefficients[n - 1 - k] = static_cast<float>(h(static_cast<double>(k) - middle, middle));
  return filter;
}

std::unique_ptr<Filter> kaiser_low_pass(const double (&values)[4], std::uint64_t count) {
  constexpr double margin = 6;       // decibels that the formulas miss by
  constexpr double steepest = 5000;  // beyond it the window has no double for its middle
  const double rate = values[0], attenuation = values[3] + margin;
  const double pass = values[1] / rate, stop = values[2] / rate;
  if (!(rate > 0 && values[3] > 0 && attenuation <= steepest)) return nullptr;
  if (!(pass >= 0 && pass < stop && stop <= 0.5)) return nullptr;
  double beta = 0;
  if (attenuation > 50)
    beta = 0.1102 * (attenuation - 8.7);
  else if (attenuation > 21)
    beta = 0.5842 * std::pow(attenuation - 21, 0.4) + 0.07886 * (attenuation - 21);
  const double d = attenuation > 21 ? (attenuation - 7.95) / 14.36 : 0.9222;
  const double edge = pass + stop, peak = bessel_i0(beta);
  return symmetric(std::ceil(d / (stop - pass)) + 1, count, [=](double t, double middle) {
    const double x = middle == 0 ? 0 : t / middle;
    return edge * sinc(edge * t) * bessel_i0(beta * std::sqrt(std::max(0.0, 1 - x * x))) / peak;
  });
}

/// The impulse response at t symbols, 1 symbol a unit.
double root_raised_cosine(double t, double roll_off) noexcept {
  // Closer to a zero of the divisor the limit is the better value: both are off by some 1e-8 there.
  constexpr double close = 1e-8;
  if (std::abs(t) < close) return 1 - roll_off + 4 * roll_off / pi;
  const double x = 4 * roll_off * t, divisor = 1 - x * x;
  if (std::abs(divisor) < close) {
    const double angle = pi / (4 * roll_off);
    return roll_off / std::numbers::sqrt2 * ((1 + 2 / pi) * std::sin(angle) + (1 - 2 / pi) * std::cos(angle));
  }
  return (std::sin(pi * t * (1 - roll_off)) + x * std::cos(pi * t * (1 + roll_off))) / (pi * t * divisor);
}

std::unique_ptr<Filter> root_raised_cosine(const double (&values)[4], std::uint64_t count) {
  const double rate = values[0], roll_off = values[2], span = values[3];
  const double samples = rate / values[1];  // a symbol
  if (!(rate > 0 && values[1] > 0 && samples >= 1 && std::isfinite(samples))) return nullptr;
  if (!(roll_off >= 0 && roll_off <= 1 && span > 0)) return nullptr;
  auto filter = symmetric(std::round(span * samples) + 1, count,
                          [=](double t, double) { return root_raised_cosine(t / samples, roll_off); });
  if (!filter) return nullptr;
  double energy = 0;
  for (const double h : filter->coefficients()) energy += h * h;
  const double scale = 1 / std::sqrt(energy);
  for (float &h : filter->coefficients()) h = static_cast<float>(h * scale);
  return filter;
}

std::unique_ptr<Filter> given(const void *input, std::uint64_t count) {
  const auto coefficients = host::elements(static_cast<lumra_f32_block *const *>(input));
  if (coefficients.empty() || (count != 0 && count != coefficients.size())) return nullptr;
  auto filter = std::make_unique<Filter>(coefficients.size(), 0.F);
  std::copy(coefficients.begin(), coefficients.end(), filter->coefficients().begin());
  return filter;
}

}  // namespace

std::unique_ptr<Filter> design_filter(const lumra_filter_key &key, const void *input, std::uint64_t count) {
  if (key.kind == LUMRA_FILTER_GIVEN) return given(input, count);
  if (!std::all_of(std::begin(key.values), std::end(key.values), [](double v) { return std::isfinite(v); }))
    return nullptr;
  if (key.kind == LUMRA_FILTER_KAISER_LOW_PASS) return kaiser_low_pass(key.values, count);
  if (key.kind == LUMRA_FILTER_ROOT_RAISED_COSINE) return root_raised_cosine(key.values, count);
  return nullptr;
}

}  // namespace qsrfhs
