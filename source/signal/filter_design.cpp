// SPDX-License-Identifier: MIT
#include "signal/filter_design.hpp"

#include <bit>
#include <complex>
#include <numeric>
#include <optional>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/block_transform.hpp"

namespace dsp {
namespace {

/// Measures low passes of up to so many taps.
class lowpass_meter {
 public:
  lowpass_meter(const lowpass_request &request, std::size_t most_taps)
      : request_(request),
        transform_(std::bit_ceil(points_a_ripple * most_taps)),
        taps_(transform_.length()),
        gains_(transform_.bins()) {}

  /// The largest deviation in both bands.
  double deviation(std::size_t length, double beta) {
    const qsrfhs::mkl_runtime::use in_use;
    const auto taps = taps_.elements().first(length);
    make_kaiser_lowpass(request_, beta, taps);
    std::fill(taps_.data() + length, taps_.data() + taps_.size(), 0.0);
    transform_.forward(taps_.data(), gains_.data());
    double largest = std::max(std::abs(gain(taps, request_.stop)), std::abs(gain(taps, request_.pass) - 1));
    const auto points = static_cast<double>(transform_.length());
    const auto last_pass = static_cast<std::size_t>(request_.pass * points);
    for (std::size_t k = 0; k <= last_pass; ++k) largest = std::max(largest, std::abs(std::abs(gains_.data()[k]) - 1));
    for (auto k = static_cast<std::size_t>(std::ceil(request_.stop * points)); k < gains_.size(); ++k)
      largest = std::max(largest, std::abs(gains_.data()[k]));
    return largest;
  }

 private:
  static constexpr std::size_t points_a_ripple = 16;  // so that a peak is found to 0.05 dB

  /// The response at a frequency, without its delay.
  static double gain(std::span<const double> taps, double frequency) noexcept {
    const double middle = static_cast<double>(taps.size() - 1) / 2;
    double sum = 0;
    for (std::size_t k = 0; k < taps.size(); ++k)
      sum += taps[k] * std::cos(2 * std::numbers::pi * frequency * (static_cast<double>(k) - middle));
    return sum;
  }

  lowpass_request request_;
  block_transform<double> transform_;
  qsrfhs::aligned_buffer<double> taps_;
  qsrfhs::aligned_buffer<std::complex<double>> gains_;
};

/// The window with which so many taps keep the deviation. A wider one lowers the ripples and widens the transition, so
/// that there is one best beta between two that are too far off; the search ends with the first that is good enough.
std::optional<double> find_beta(lowpass_meter &meter, std::size_t length, double around, double deviation) {
  constexpr double section = 0.6180339887498949;
  double low = std::max(0.0, 0.8 * around - 1), high = 1.1 * around + 1;
  double left = high - section * (high - low), right = low + section * (high - low);
  double at_left = meter.deviation(length, left), at_right = meter.deviation(length, right);
  while (high - low > 0.02) {
    if (at_left <= deviation) return left;
    if (at_right <= deviation) return right;
    if (at_left < at_right) {
      high = right;
      right = left;
      at_right = at_left;
      left = high - section * (high - low);
      at_left = meter.deviation(length, left);
    } else {
      low = left;
      left = right;
      at_left = at_right;
      right = low + section * (high - low);
      at_right = meter.deviation(length, right);
    }
  }
  return std::nullopt;
}

/// The search among filters of up to a few thousand taps.
lowpass_design search_lowpass(const lowpass_request &request, const kaiser_formulas &formulas) {
  const double estimate = formulas.width / (request.stop - request.pass) + 1;
  const auto most = static_cast<std::size_t>(2 * estimate + 16);
  lowpass_meter meter(request, most);
  std::size_t too_few = 0, enough = most;
  double beta = formulas.beta;
  for (auto length = static_cast<std::size_t>(std::ceil(estimate)); enough - too_few > 1;) {
    if (const auto found = find_beta(meter, length, formulas.beta, request.deviation)) {
      enough = length;
      beta = *found;
    } else {
      too_few = length;
    }
    // In steps of some hundredths while one of the bounds is only assumed.
    const std::size_t step = std::max<std::size_t>(1, length / 32);
    if (too_few == 0)
      length = enough - std::min(step, enough - 1);
    else if (enough == most)
      length = std::min(too_few + step, most - 1);
    else
      length = (too_few + enough) / 2;
    if (length == 0) break;
  }
  return {static_cast<double>(enough), beta};
}

}  // namespace

void make_kaiser_lowpass(const lowpass_request &request, double beta, std::span<double> taps) noexcept {
  make_symmetric(taps, kaiser_lowpass_response(request.pass + request.stop, beta));
  const double sum = std::accumulate(taps.begin(), taps.end(), 0.0);
  for (double &tap : taps) tap /= sum;
}

lowpass_design design_kaiser_lowpass(const lowpass_request &request) {
  constexpr double missed_by_meter = 0.99;
  lowpass_request sought = request;
  sought.deviation *= missed_by_meter;
  const kaiser_formulas formulas(-20 * std::log10(sought.deviation));
  // A long filter is the stretched picture of a short one: its response around an edge is that of any filter with the
  // same product of length and transition, and the same distances from 0 and half the rate, unless these are far.
  constexpr double longest_searched = 2000, missed_by_picture = 0.98;
  const double estimate = formulas.width / (request.stop - request.pass) + 1;
  const double stretch = std::max(1.0, estimate / longest_searched);
  if (stretch > 1) {
    const double edge = (request.pass + request.stop) / 2, half = (request.stop - request.pass) / 2 * stretch;
    const double from_zero = edge * stretch, from_end = (0.5 - edge) * stretch;
    const double middle = from_zero < 0.25 ? from_zero : from_end < 0.25 ? 0.5 - from_end : 0.25;
    sought = {std::max(0.0, middle - half), std::min(0.5, middle + half), sought.deviation * missed_by_picture};
  }
  lowpass_design design = search_lowpass(sought, formulas);
  if (stretch > 1) design.length = std::ceil(design.length * stretch);
  return design;
}

void make_root_raised_cosine(double samples, double roll_off, std::span<double> taps) noexcept {
  make_symmetric(taps, [=](double t, double) { return root_raised_cosine(t / samples, roll_off); });
  const double energy = std::inner_product(taps.begin(), taps.end(), taps.begin(), 0.0);
  const double scale = 1 / std::sqrt(energy);
  for (double &tap : taps) tap *= scale;
}

}  // namespace dsp
