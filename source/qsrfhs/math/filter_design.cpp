// SPDX-License-Identifier: MIT
#include "qsrfhs/math/filter_design.hpp"

#include <algorithm>
#include <cmath>

#include "host/host_array.hpp"
#include "signal/filter_design.hpp"

namespace qsrfhs {
namespace {

/// A symmetric filter of `count` taps, or of `length` where none are asked for.
template <class Response>
std::unique_ptr<Filter> symmetric(double length, std::uint64_t count, Response h) {
  const double wanted = count != 0 ? static_cast<double>(count) : length;
  if (!(wanted >= 1 && wanted <= dsp::longest_design)) return nullptr;
  const auto n = static_cast<std::size_t>(wanted);
  auto filter = std::make_unique<Filter>(n, 0.F);
  dsp::make_symmetric(filter->coefficients(), h);
  return filter;
}

std::unique_ptr<Filter> kaiser_low_pass(const double (&values)[4], std::uint64_t count) {
  constexpr double margin = 6;       // decibels that the formulas miss by
  constexpr double steepest = 5000;  // beyond it the window has no double for its middle
  const double rate = values[0], attenuation = values[3] + margin;
  const double pass = values[1] / rate, stop = values[2] / rate;
  if (!(rate > 0 && values[3] > 0 && attenuation <= steepest)) return nullptr;
  if (!(pass >= 0 && pass < stop && stop <= 0.5)) return nullptr;
  const dsp::kaiser_formulas formulas(attenuation);
  return symmetric(std::ceil(formulas.width / (stop - pass)) + 1, count,
                   dsp::kaiser_lowpass_response(pass + stop, formulas.beta));
}

std::unique_ptr<Filter> root_raised_cosine(const double (&values)[4], std::uint64_t count) {
  const double rate = values[0], roll_off = values[2], span = values[3];
  const double samples = rate / values[1];  // a symbol
  if (!(rate > 0 && values[1] > 0 && samples >= 1 && std::isfinite(samples))) return nullptr;
  if (!(roll_off >= 0 && roll_off <= 1 && span > 0)) return nullptr;
  auto filter = symmetric(dsp::root_raised_cosine_length(samples, span), count,
                          [=](double t, double) { return dsp::root_raised_cosine(t / samples, roll_off); });
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
