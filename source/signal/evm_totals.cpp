// SPDX-License-Identifier: MIT
#include "signal/evm_totals.hpp"

#include <algorithm>
#include <bit>
#include <cmath>

namespace dsp {

error_block::error_block(std::uint64_t block, const positions &record) noexcept {
  const std::uint64_t begin = window_begin(block);
  inner = {std::max(block * length, record.first), std::min((block + 1) * length, record.last)};
  around = {std::max(begin, record.first), std::min(begin + window, record.last)};
}

error_outcome fit_model(const stream_moments &sums, double samples, const alignment &wanted, bool searched,
                        stream_model &model, model_change &change) {
  // Errors of ten times the reference, or a correlation that one of so many trials finds in unrelated noise.
  constexpr double least = 0.01, for_search = 20, most = 0.5;
  if (sums.reference == 0) return error_outcome::silent_reference;
  if (!wanted.gain && !searched) {
    if (wanted.dc) model.dc = (sums.measured_dc - model.gain * sums.reference_dc) / samples;
    return error_outcome::measured;
  }
  change.kept_gain = model.gain;
  const alignment_outcome outcome = improve(sums, samples, wanted, change);
  if (outcome == alignment_outcome::undetermined) return error_outcome::undetermined;
  const double threshold = searched ? std::min(least + for_search / samples, most) : least;
  if (outcome == alignment_outcome::unrelated || !(change.fitted >= threshold * change.measured))
    return error_outcome::unrelated;
  model.delay += std::clamp(change.delay, -1.0, 1.0);
  model.frequency += change.frequency;
  if (wanted.gain) model.gain = change.gain;
  if (wanted.dc) model.dc = change.dc;
  return error_outcome::measured;
}

void error_totals::add(const block_sums &block) noexcept {
  const auto moments = std::bit_cast<stream_moments::numbers>(block.moments);
  for (std::size_t k = 0; k < moments.size(); ++k) sums_[k].add(moments[k]);
  const double errors[] = {block.errors.error, block.errors.magnitude, block.errors.phase};
  for (std::size_t k = 0; k < std::size(errors); ++k) sums_[moments.size() + k].add(errors[k]);
  if (block.errors.peak.power >= 0 || std::isnan(block.errors.peak.power))
    peak_.take(block.errors.peak.power, block.errors.peak.position);
}

void error_totals::add(const error_totals &other) noexcept {
  for (std::size_t k = 0; k < sums_.size(); ++k) sums_[k].add(other.sums_[k]);
  if (other.peak_.power >= 0 || std::isnan(other.peak_.power)) peak_.take(other.peak_.power, other.peak_.position);
}

stream_moments error_totals::moments() const noexcept {
  stream_moments::numbers values;
  for (std::size_t k = 0; k < values.size(); ++k) values[k] = sums_[k].value();
  return std::bit_cast<stream_moments>(values);
}

error_outcome error_totals::read(const positions &compared, const stream_model &model,
                                 error_figures &figures) const noexcept {
  const double power = sums_[0].value(), count = static_cast<double>(compared.count());
  if (power == 0) return error_outcome::silent_reference;
  constexpr std::size_t errors = stream_moments::count;
  figures.compared = compared;
  figures.model = model;
  figures.reference_rms = std::sqrt(power / count);
  figures.rms = std::sqrt(sums_[errors].value() / count) / figures.reference_rms;
  figures.magnitude_rms = std::sqrt(sums_[errors + 1].value() / count) / figures.reference_rms;
  figures.phase_rms = std::sqrt(sums_[errors + 2].value() / count);
  figures.peak = {peak_.power * count / power, peak_.position};
  return error_outcome::measured;
}

error_outcome error_totals::refine(const positions &record, const positions &compared, const alignment &wanted,
                                   const stream_model &model, model_refinement &refined) const {
  // Of a step, in samples and in turns over half the record; what is left after it goes with its square.
  constexpr double settled = 1e-4, rough = 1e-2;
  const stream_moments sums = moments();
  const auto samples = static_cast<double>(record.count()), count = static_cast<double>(compared.count());
  model_change change;
  refined.model = model;
  const error_outcome outcome = fit_model(sums, count, wanted, wanted.searched(), refined.model, change);
  if (outcome != error_outcome::measured) return outcome;
  if (!(std::abs(refined.model.delay) <= longest_model_delay)) return error_outcome::unrelated;
  refined.model.frequency -= std::round(refined.model.frequency);
  refined.reference_rms = std::sqrt(sums.reference / count);
  const double step = std::max(std::abs(change.delay), std::abs(change.frequency) * samples / 2);
  refined.settled = step < settled;
  if (wanted.frequency) refined.reach = std::min(step < rough ? longer(samples) : samples, 0x1p62);
  return error_outcome::measured;
}

error_totals::image error_totals::save() const noexcept {
  image saved{peak_, {}};
  for (std::size_t k = 0; k < sums_.size(); ++k) saved.sums[k] = sums_[k].save();
  return saved;
}

bool error_totals::load(const image &saved) noexcept {
  peak_ = saved.peak;
  bool valid = true;
  for (std::size_t k = 0; k < sums_.size(); ++k) valid = sums_[k].load(saved.sums[k]) && valid;
  return valid;
}

positions known_positions(const positions &record, double delay) noexcept {
  const auto guard = static_cast<double>(delayed_reference<std::complex<float>>::guard(record.count()));
  const double first = std::ceil(guard + delay), last = std::ceil(guard - delay);
  const auto inside = [&record](double d) {
    return d <= 0 ? 0 : std::min(static_cast<std::uint64_t>(d), record.count());
  };
  const std::uint64_t begin = record.first + inside(first);
  return {begin, std::max(begin, record.last - inside(last))};
}

}  // namespace dsp
