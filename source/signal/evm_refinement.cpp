// SPDX-License-Identifier: MIT
#include "signal/evm_refinement.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <complex>
#include <cstddef>

#include "signal/rotation.hpp"
#include "signal/stream_moments.hpp"

namespace dsp {
namespace {

using wide = std::complex<double>;

/// The sums over a part, whose middle is the time 0.
template <class Sample>
stream_moments sum_part(delayed_reference<Sample> &delayed, std::span<const Sample> measured, const stretch &part,
                        slopes with, double middle, const stream_model &model) {
  stream_moments sums;
  delayed.walk(part, model.delay, with, [&](std::size_t first, auto values, auto derivatives) {
    constexpr std::size_t run = 256;
    std::array<wide, run> carried, sloped;
    for (std::size_t begin = 0; begin < values.size(); begin += run) {
      const std::size_t count = std::min(run, values.size() - begin), at = first + begin;
      const double t = static_cast<double>(at) - middle;
      rotate(values.subspan(begin, count), model.frequency, t, 1, carried);
      std::span<const wide> v;
      if (with == slopes::computed) {
        rotate(derivatives.subspan(begin, count), model.frequency, t, 1, sloped);
        v = std::span(sloped).first(count);
      }
      sums.add(std::span<const wide>(carried).first(count), v, measured.data() + at, t);
    }
  });
  return sums;
}

}  // namespace

template <class Sample>
alignment_outcome refine(delayed_reference<Sample> &delayed, std::span<const Sample> measured, const alignment &wanted,
                         const stretch &part, refinement how, stream_model &model) {
  constexpr int most_rounds = 12;
  constexpr double least_correlation = 0.005;
  const double enough = how == refinement::full ? 1e-5 : 1e-2;  // of the last step, whose square is what is left
  const double half = static_cast<double>(part.count()) / 2, middle = static_cast<double>(part.first) + half;
  const slopes with = wanted.delay ? slopes::computed : slopes::left_out;
  for (int round = 0; round < most_rounds; ++round) {
    const stretch known = wanted.delay ? delayed.known(model.delay) : stretch{0, measured.size()};
    const stretch compared{std::max(part.first, known.first), std::min(part.last, known.last)};
    if (compared.first >= compared.last) return alignment_outcome::unrelated;
    const stream_moments sums = sum_part(delayed, measured, compared, with, middle, model);
    model_change change;
    const alignment_outcome outcome = improve(sums, static_cast<double>(compared.count()), wanted, change);
    if (outcome != alignment_outcome::found) return outcome;
    if (round > 0 && !(change.fitted >= least_correlation * change.measured)) return alignment_outcome::unrelated;
    model.delay += std::clamp(change.delay, -1.0, 1.0);
    model.frequency += change.frequency;
    if (std::abs(change.delay) < enough && std::abs(change.frequency) * half < enough) break;
  }
  return alignment_outcome::found;
}

template alignment_outcome refine(delayed_reference<std::complex<float>> &, std::span<const std::complex<float>>,
                                  const alignment &, const stretch &, refinement, stream_model &);
template alignment_outcome refine(delayed_reference<std::complex<double>> &, std::span<const std::complex<double>>,
                                  const alignment &, const stretch &, refinement, stream_model &);

}  // namespace dsp
