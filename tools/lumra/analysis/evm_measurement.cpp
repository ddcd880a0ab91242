// SPDX-License-Identifier: MIT
#include "analysis/evm_measurement.hpp"

#include <algorithm>
#include <cmath>
#include <lumra/lumra.hpp>
#include <vector>

#include "recording/sample_reader.hpp"
#include "terminal/failure.hpp"
#include "terminal/progress.hpp"

namespace tool {
namespace {

using sample = std::complex<float>;

/// Errors above this many times the reference would not leave room for products in single precision.
constexpr double largest_error = 1e15;

/// What the recordings have in common.
struct relation {
  double reference_power = 0, measured_power = 0;  // sums
  std::complex<double> product;                    // sum of conj(reference) * measured
};

/// Sums over both recordings; the measured samples are read for an alignment only.
relation relate(const evm_input &reference, const evm_input &measured, const evm_settings &settings) {
  recording::sample_reader from(reference.source, reference.over), to(measured.source, measured.over);
  progress bar(settings.align != LUMRA_ALIGN_NONE ? "Aligning" : "Levelling");
  std::vector<sample> r(std::min(settings.block, settings.samples));
  std::vector<sample> m(settings.align != LUMRA_ALIGN_NONE ? r.size() : 0);
  relation sums;
  double re = 0, im = 0;
  for (std::uint64_t done = 0; done < settings.samples;) {
    const auto count = std::min<std::uint64_t>(r.size(), settings.samples - done);
    from.read(std::span(r).first(count));
    for (std::size_t i = 0; i < count; ++i) sums.reference_power += std::norm(std::complex<double>(r[i]));
    if (settings.align != LUMRA_ALIGN_NONE) {
      to.read(std::span(m).first(count));
      for (std::size_t i = 0; i < count; ++i) {
        const double a = r[i].real(), b = r[i].imag(), c = m[i].real(), d = m[i].imag();
        sums.measured_power += c * c + d * d;
        re += a * c + b * d;
        im += a * d - b * c;
      }
    }
    done += count;
    bar.update(done, settings.samples);
  }
  sums.product = {re, im};
  return sums;
}

/// The gain g that minimises the sum of |measured - g * reference|^2.
std::complex<double> fitted_gain(const relation &sums, const evm_input &measured) {
  // Below, the sums agree within their rounding with those of recordings that have nothing in common.
  const double rounding = 1e-13 * std::sqrt(sums.reference_power) * std::sqrt(sums.measured_power);
  if (std::abs(sums.product) <= rounding)
    throw failure("{}: holds nothing of the reference, so there is no gain to align by; leave out --align",
                  measured.source.data.string());
  return sums.product / sums.reference_power;
}

/// The products are in double precision, so that a power of two changes no digit.
void multiply(std::span<sample> samples, std::complex<double> factor) noexcept {
  const double c = factor.real(), d = factor.imag();
  for (sample &x : samples) {
    const double a = x.real(), b = x.imag();
    x = {static_cast<float>(a * c - b * d), static_cast<float>(a * d + b * c)};
  }
}

class statistics {
 public:
  void add(float value, std::uint64_t index) noexcept {
    const double x = value;
    sum_ += x;
    squares_ += x * x;
    ++count_;
    if (std::abs(x) <= std::abs(result_.peak)) return;
    result_.peak = x;
    result_.peak_at = index;
  }

  /// Gives the figures in multiples of unit.
  [[nodiscard]] deviation in(double unit) const noexcept {
    const auto count = static_cast<double>(std::max<std::uint64_t>(count_, 1));
    return {std::sqrt(squares_ / count) / unit, sum_ / count / unit, result_.peak / unit, result_.peak_at};
  }

 private:
  double sum_ = 0, squares_ = 0;
  std::uint64_t count_ = 0;
  deviation result_;
};

}  // namespace

bool has_phase(sample reference, sample measured) noexcept {
  return reference != sample() && measured != sample();
}

namespace {

/// Both recordings, part by part.
class recorded_pair {
 public:
  recorded_pair(const evm_input &reference, const evm_input &measured, std::uint64_t samples)
      : from_(reference.source, reference.over), to_(measured.source, measured.over), samples_(samples) {}

  [[nodiscard]] std::uint64_t samples() const noexcept { return samples_; }

  struct part {
    std::uint64_t first, samples;
  };
  struct pair {
    std::span<const sample> reference, measured;
  };
  /// The samples are valid until the next call.
  pair read(const part &wanted) {
    read(from_, wanted, reference_);
    read(to_, wanted, measured_);
    return {reference_, measured_};
  }
  std::span<const sample> read_reference(const part &wanted) {
    read(from_, wanted, reference_);
    return reference_;
  }

 private:
  static void read(recording::sample_reader &reader, const part &wanted, std::vector<sample> &to) {
    to.resize(wanted.samples);
    reader.seek(wanted.first);
    reader.read(std::span(to));
  }

  recording::sample_reader from_, to_;
  std::uint64_t samples_;
  std::vector<sample> reference_, measured_;
};

constexpr std::uint64_t window = LUMRA_EVM_WINDOW;

failure silent(const evm_input &reference) {
  return failure("{}: all samples are zero, which no error can be related to; give a reference with a signal",
                 reference.source.data.string());
}

/// Where the reference has the most energy.
recorded_pair::part loudest(recorded_pair &pair) {
  progress bar("Searching");
  recorded_pair::part best{0, std::min(pair.samples(), window)};
  if (best.samples == pair.samples()) return best;
  double most = -1;
  for (std::uint64_t first = 0; first < pair.samples(); first += window) {
    const recorded_pair::part part{std::min(first, pair.samples() - window), window};
    double energy = 0;
    for (const sample &v : pair.read_reference(part)) energy += std::norm(std::complex<double>(v));
    bar.update(part.first + window, pair.samples());
    if (energy <= most) continue;
    most = energy;
    best = part;
  }
  return best;
}

lumra_evm_refinement refine(recorded_pair &pair, const recorded_pair::part &part,
                            const lumra_evm_meter_options &options) {
  lumra_evm_meter_options here = options;
  here.start = part.first;
  lumra::evm_meter<sample> meter(here);
  progress bar("Aligning");
  for (std::uint64_t done = 0; done < part.samples;) {
    const recorded_pair::part piece{part.first + done, std::min(window, part.samples - done)};
    const auto [reference, measured] = pair.read(piece);
    meter.add(reference, measured);
    done += piece.samples;
    bar.update(done, part.samples);
  }
  return meter.refine();
}

/// The options of a meter under the model that aligns the recordings, and the reference's RMS.
struct aligned_model {
  lumra_evm_meter_options options;
  double reference_rms;
};

aligned_model align(recorded_pair &pair, const lumra_evm_meter_options &given) {
  aligned_model found{given, 0};
  const bool searched = (given.align & (LUMRA_ALIGN_DELAY | LUMRA_ALIGN_FREQUENCY)) != 0;
  const std::uint64_t n = pair.samples();
  recorded_pair::part part{0, n};
  if (searched) {
    part = loudest(pair);
    const auto [reference, measured] = pair.read(part);
    const auto begun =
        lumra::measure_evm<sample>(reference, measured, static_cast<lumra::align>(given.align), given.sample_rate_hz);
    found.options.delay_samples = begun.delay_samples;
    found.options.frequency_hz = begun.frequency_hz;
    if (part.samples == n) {
      found.options.gain_re = begun.gain_re;
      found.options.gain_im = begun.gain_im;
      found.options.dc_re = begun.dc_re;
      found.options.dc_im = begun.dc_im;
      found.reference_rms = begun.reference_rms;
      return found;
    }
  }
  constexpr int most_rounds = 24;
  for (int round = 0; round < most_rounds; ++round) {
    const lumra_evm_refinement better = refine(pair, part, found.options);
    found.options.gain_re = better.gain_re;
    found.options.gain_im = better.gain_im;
    found.options.delay_samples = better.delay_samples;
    found.options.frequency_hz = better.frequency_hz;
    found.options.dc_re = better.dc_re;
    found.options.dc_im = better.dc_im;
    found.reference_rms = better.reference_rms;
    if (part.samples == n && better.settled != 0) break;
    const std::uint64_t longer = std::min(better.reach, n), middle = part.first + part.samples / 2;
    part = {std::min(middle - std::min(middle, longer / 2), n - longer), longer};
  }
  return found;
}

/// Aligns; says what is wrong with which recording where there is no alignment.
aligned_model align_or_fail(recorded_pair &pair, const lumra_evm_meter_options &given, const evm_input &reference,
                            const evm_input &measured) {
  try {
    return align(pair, given);
  } catch (const lumra::error &problem) {
    switch (problem.status().code()) {
      case LUMRA_TOO_FEW_SAMPLES:
        throw failure("{}: {} samples are too few to find a delay or a frequency in; give more, or --align=gain",
                      measured.source.data.string(), pair.samples());
      case LUMRA_NO_CONVERGENCE:
        throw failure(
            "{}: seems unrelated to the reference, or the reference cannot tell what is to be aligned; ask for less of "
            "--align",
            measured.source.data.string());
      case LUMRA_OUT_OF_RANGE:
        throw silent(reference);
      default:
        throw;
    }
  }
}

evm_result measure_aligned(const evm_input &reference, const evm_input &measured, const evm_settings &settings,
                           const std::function<void(const evm_block &)> &see) {
  const std::uint64_t n = settings.samples;
  recorded_pair pair(reference, measured, n);
  lumra_evm_meter_options options = LUMRA_EVM_METER_OPTIONS;
  options.align = settings.align;
  options.sample_rate_hz = reference.source.rate;
  const aligned_model found = align_or_fail(pair, options, reference, measured);
  options = found.options;

  evm_result result;
  const double unit = result.reference_rms = found.reference_rms;
  result.gain = {options.gain_re, options.gain_im};
  result.dc = {options.dc_re, options.dc_im};
  result.delay_samples = options.delay_samples;
  result.frequency_hz = options.frequency_hz;
  const auto delay = static_cast<std::int64_t>(std::llround(options.delay_samples));
  statistics errors, magnitudes, phases;
  std::vector<sample> vectors(std::min(n, window)), aligned(vectors.size());
  std::vector<float> error(vectors.size()), magnitude(vectors.size()), phase(vectors.size());
  progress bar("Comparing");
  // Each block has its neighbours with it; a record that is no longer than a window is one block.
  constexpr std::uint64_t margin = (window - LUMRA_EVM_BLOCK) / 2;
  const std::uint64_t step = n <= window ? n : LUMRA_EVM_BLOCK;
  for (std::uint64_t begin = 0; begin < n; begin += step) {
    options.start = begin - std::min(begin, margin);
    const recorded_pair::part around{options.start, std::min(window, n - options.start)};
    const auto [r, m] = pair.read(around);
    lumra::trace_evm<sample>(
        options, r, m,
        {std::span(vectors).first(r.size()), std::span(magnitude).first(r.size()), std::span(phase).first(r.size())});
    // What cannot be compared, at the ends, is NaN.
    auto first = static_cast<std::size_t>(begin - around.first);
    auto last = static_cast<std::size_t>(std::min(begin + step, n) - around.first);
    while (first < last && std::isnan(phase[first])) ++first;
    while (first < last && std::isnan(phase[last - 1])) --last;
    if (first == last) continue;
    if (result.samples == 0) result.first = around.first + first;
    result.samples += last - first;
    // The nearest sample of the reference stands for the one between.
    const sample *of = r.data() - delay;
    for (std::size_t k = first; k < last; ++k) {
      const std::uint64_t index = around.first + k;
      error[k] = std::abs(vectors[k]);
      aligned[k] = of[k] + vectors[k];
      errors.add(error[k], index);
      magnitudes.add(magnitude[k], index);
      if (has_phase(of[k], m[k]))
        phases.add(phase[k], index);
      else
        ++result.without_phase;
    }
    const std::size_t count = last - first;
    see({around.first + first,
         around.first + first - result.first,
         unit,
         {of + first, count},
         {aligned.data() + first, count},
         {error.data() + first, count},
         {magnitude.data() + first, count},
         {phase.data() + first, count}});
    bar.update(begin + step, n);
  }
  result.error = errors.in(unit);
  result.magnitude = magnitudes.in(unit);
  result.phase = phases.in(1);
  return result;
}

}  // namespace

evm_result measure_evm(const evm_input &reference, const evm_input &measured, const evm_settings &settings,
                       const std::function<void(const evm_block &)> &see) {
  if ((settings.align & ~std::uint32_t{LUMRA_ALIGN_GAIN}) != 0)
    return measure_aligned(reference, measured, settings, see);
  const relation sums = relate(reference, measured, settings);
  if (sums.reference_power == 0) throw silent(reference);
  evm_result result;
  result.samples = settings.samples;
  result.reference_rms = std::sqrt(sums.reference_power / static_cast<double>(settings.samples));
  if (settings.align != LUMRA_ALIGN_NONE) result.gain = fitted_gain(sums, measured);
  // Near one, no product leaves the range of single precision.
  const double scale = std::scalbn(1.0, -std::ilogb(result.reference_rms));
  const double unit = result.reference_rms * scale;

  recording::sample_reader from(reference.source, reference.over), to(measured.source, measured.over);
  progress bar("Comparing");
  const auto block = std::min(settings.block, settings.samples);
  lumra::host_matrix<sample> r(1, block), m(1, block);
  lumra::host_matrix<float> error(1, block), magnitude(1, block), phase(1, block);
  statistics errors, magnitudes, phases;
  for (std::uint64_t done = 0; done < settings.samples;) {
    const auto count = std::min(block, settings.samples - done);
    if (count < block) {
      for (auto *matrix : {&r, &m}) matrix->resize(1, count);
      for (auto *matrix : {&error, &magnitude, &phase}) matrix->resize(1, count);
    }
    from.read(r.elements());
    to.read(m.elements());
    multiply(r.elements(), scale);
    multiply(m.elements(), scale / result.gain);
    lumra::error_magnitude(r, m, error);
    lumra::magnitude_error(r, m, magnitude);
    lumra::phase_error(r, m, phase);
    const evm_block seen{
        done, done, unit, r.elements(), m.elements(), error.elements(), magnitude.elements(), phase.elements()};
    for (std::size_t i = 0; i < count; ++i) {
      errors.add(seen.error[i], done + i);
      magnitudes.add(seen.magnitude[i], done + i);
      if (has_phase(seen.reference[i], seen.measured[i]))
        phases.add(seen.phase[i], done + i);
      else
        ++result.without_phase;
    }
    if (!(errors.in(unit).rms < largest_error))
      throw failure("{}: samples are too large beside the reference; scale the recording down",
                    measured.source.data.string());
    see(seen);
    done += count;
    bar.update(done, settings.samples);
  }
  result.error = errors.in(unit);
  result.magnitude = magnitudes.in(unit);
  result.phase = phases.in(1);
  return result;
}

}  // namespace tool
