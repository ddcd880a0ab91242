// SPDX-License-Identifier: MIT
#include "signal/main_lobe.hpp"

#include <algorithm>
#include <cmath>
#include <numbers>

namespace dsp {
namespace {

constexpr double pi = std::numbers::pi;

double sinc(double bins) noexcept {
  return bins == 0 ? 1 : std::sin(pi * bins) / (pi * bins);
}

/// The mean of n samples of a cosine of so many periods around its middle.
double dirichlet(double bins, double n) noexcept {
  return bins == 0 ? 1 : std::sin(pi * bins) / (n * std::tan(pi * bins / n));
}

}  // namespace

main_lobe::main_lobe(const window_shape &shape, std::uint64_t points) noexcept
    : sum_(shape.type == LUMRA_WINDOW_KAISER ? nullptr : &cosine_sums[shape.type]),
      beta_(shape.parameter),
      count_(static_cast<double>(points)),
      half_width_(sum_ ? sum_->terms : std::sqrt(1 + (beta_ / pi) * (beta_ / pi))) {
  if (sum_) {
    for (std::int32_t k = 0; k < sum_->terms; ++k) {
      const auto at = static_cast<std::size_t>(k);
      tangents_[at] = std::tan(pi * k / count_);
      end_ += k % 2 == 0 ? sum_->a[at] : -sum_->a[at];
    }
  } else {
    end_ = 1;
  }
  middle_ = sum_ ? sum_->a[0] : kaiser_at(0);
  const double lowest = magnitude(0.5);
  largest_gain_ = std::max(1.0, 1 / (lowest * lowest));
}

double main_lobe::magnitude(double bins) const noexcept {
  const double sine = std::sin(pi * bins) / count_;
  // The first sample has none opposite to it: its half is the imaginary part.
  const double real = (sum_ ? cosine_sum_at(bins, sine) : kaiser_at(bins)) / middle_, imaginary = end_ * sine / middle_;
  return std::sqrt(real * real + imaginary * imaginary);
}

// The sum over k of a[k] (D(f + k) + D(f - k)) / 2 with the Dirichlet kernels D. These share one sine and, by the
// addition theorem, one tangent; the nearest kernel, where that theorem cancels, is computed by itself.
double main_lobe::cosine_sum_at(double f, double sine) const noexcept {
  const double t = std::tan(pi * f / count_);
  double total = 0;
  for (std::int32_t k = 0; k < sum_->terms; ++k) {
    const auto at = static_cast<std::size_t>(k);
    const double tau = tangents_[at], signed_sine = k % 2 == 0 ? sine : -sine;
    const bool nearest = std::abs(f - k) < 0.25;
    const double right = nearest ? dirichlet(f - k, count_) : signed_sine * (1 + t * tau) / (t - tau);
    const double left = k == 0 ? right : signed_sine * (1 - t * tau) / (t + tau);
    total += sum_->a[at] / 2 * (left + right);
  }
  return total;
}

// In units of the value at the ends, which is 1: the window jumps there, and its samples' transform repeats the jump's.
double main_lobe::kaiser_at(double f) const noexcept {
  const double square = beta_ * beta_ - pi * f * pi * f, root = std::sqrt(std::abs(square));
  const double continuous = root == 0 ? 1 : (square > 0 ? std::sinh(root) : std::sin(root)) / root;
  return continuous + (dirichlet(f, count_) - sinc(f));
}

// What a tone's offset is found by. It rises with the offset.
double main_lobe::slope_figure(double offset) const noexcept {
  const double nearer = magnitude(1 - offset), farther = half_width_ >= 2 ? magnitude(1 + offset) : 0;
  return (nearer - farther) / magnitude(offset);
}

main_lobe::tone main_lobe::interpolate(double below, double middle, double above) const noexcept {
  const double left = std::sqrt(below / middle), right = std::sqrt(above / middle);
  const double measured = half_width_ >= 2 ? std::abs(right - left) : std::max(left, right);
  if (!std::isfinite(measured)) return {0, 1};
  // Regula falsi, halving the value at an end that stays (Illinois).
  constexpr double exact = 1e-14;
  double low = 0, high = 0.5;
  double at_low = slope_figure(low) - measured, at_high = slope_figure(high) - measured;
  double offset = at_low >= 0 ? low : high;
  if (at_low < 0 && at_high > 0) {
    int stays = 0;
    for (int step = 0; step < 60 && high - low > exact; ++step) {
      offset = std::clamp(low - at_low * (high - low) / (at_high - at_low), low, high);
      const double here = slope_figure(offset) - measured;
      if (std::abs(here) <= exact) break;
      if (here < 0) {
        low = offset;
        at_low = here;
        if (stays > 0) at_high /= 2;
        stays = 1;
      } else {
        high = offset;
        at_high = here;
        if (stays < 0) at_low /= 2;
        stays = -1;
      }
    }
  }
  const double magnitude_there = magnitude(offset);
  return {right >= left ? offset : -offset, 1 / (magnitude_there * magnitude_there)};
}

}  // namespace dsp
