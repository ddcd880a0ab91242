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

/// All samples of an input.
std::vector<sample> read_all(const evm_input &input, std::uint64_t count) {
  recording::sample_reader reader(input.source, input.over);
  progress bar("Reading");
  std::vector<sample> x(count);
  constexpr std::uint64_t piece = std::uint64_t{1} << 20;
  for (std::uint64_t done = 0; done < count; bar.update(done, count))
    done += reader.read(std::span(x).subspan(done, std::min(piece, count - done)));
  return x;
}

evm_result measure_aligned(const evm_input &reference, const evm_input &measured, const evm_settings &settings,
                           const std::function<void(const evm_block &)> &see) {
  const std::uint64_t n = settings.samples;
  const std::vector<sample> r = read_all(reference, n), m = read_all(measured, n);
  std::vector<sample> vectors(n);
  std::vector<float> magnitude(n), phase(n);
  lumra_evm_options options = LUMRA_EVM_OPTIONS;
  options.align = settings.align;
  options.sample_rate_hz = reference.source.rate;
  lumra_evm_result found = {};
  found.size = sizeof found;
  const auto as_library = [](const sample *x) { return reinterpret_cast<const lumra_cf32 *>(x); };
  const lumra_status status =
      lumra_evm_measure_cf32(as_library(r.data()), as_library(m.data()), n, &options, &found,
                             reinterpret_cast<lumra_cf32 *>(vectors.data()), magnitude.data(), phase.data());
  const std::string &name = measured.source.data.string();
  if (status == LUMRA_TOO_FEW_SAMPLES)
    throw failure("{}: {} samples are too few to find a delay or a frequency in; give more, or --align=gain", name, n);
  if (status == LUMRA_NO_CONVERGENCE)
    throw failure(
        "{}: seems unrelated to the reference, or the reference cannot tell what is to be aligned; ask for less of "
        "--align",
        name);
  lumra::check_open(status);

  evm_result result;
  result.reference_rms = found.reference_rms;
  result.first = found.first;
  result.samples = found.samples;
  result.gain = {found.gain_re, found.gain_im};
  result.dc = {found.dc_re, found.dc_im};
  result.delay_samples = found.delay_samples;
  result.frequency_hz = found.frequency_hz;
  const double unit = found.reference_rms;
  statistics errors, magnitudes, phases;
  std::vector<float> error(std::min<std::uint64_t>(settings.block, n));
  std::vector<sample> aligned(error.size());
  const auto delay = static_cast<std::int64_t>(std::llround(found.delay_samples));
  for (std::uint64_t i = found.first; i < found.first + found.samples;) {
    const auto count = static_cast<std::size_t>(std::min<std::uint64_t>(error.size(), found.first + found.samples - i));
    // The nearest sample of the reference stands for the one between.
    const sample *of = r.data() + static_cast<std::ptrdiff_t>(i) - delay;
    for (std::size_t k = 0; k < count; ++k) {
      error[k] = static_cast<float>(unit * std::abs(std::complex<double>(vectors[i + k])));
      aligned[k] = of[k] + static_cast<float>(unit) * vectors[i + k];
      magnitude[i + k] = static_cast<float>(unit * static_cast<double>(magnitude[i + k]));
      errors.add(error[k], i + k);
      magnitudes.add(magnitude[i + k], i + k);
      if (has_phase(of[k], m[i + k]))
        phases.add(phase[i + k], i + k);
      else
        ++result.without_phase;
    }
    see({i,
         i - found.first,
         unit,
         {of, count},
         {aligned.data(), count},
         {error.data(), count},
         {magnitude.data() + i, count},
         {phase.data() + i, count}});
    i += count;
  }
  result.error = errors.in(unit);
  result.magnitude = magnitudes.in(unit);
  result.phase = phases.in(1);
  // The library's own sums have not been rounded to single precision on the way.
  result.error.rms = found.rms;
  result.magnitude.rms = found.magnitude_rms;
  result.phase.rms = found.phase_rms;
  return result;
}

}  // namespace

evm_result measure_evm(const evm_input &reference, const evm_input &measured, const evm_settings &settings,
                       const std::function<void(const evm_block &)> &see) {
  if ((settings.align & ~std::uint32_t{LUMRA_ALIGN_GAIN}) != 0)
    return measure_aligned(reference, measured, settings, see);
  const relation sums = relate(reference, measured, settings);
  if (sums.reference_power == 0)
    throw failure("{}: all samples are zero, which no error can be related to; give a reference with a signal",
                  reference.source.data.string());
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
