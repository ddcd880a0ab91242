// SPDX-License-Identifier: MIT
#include <lumra/evm.h>

#include <array>
#include <cmath>
#include <cstdint>
#include <span>
#include <string_view>
#include <utility>

#include "open/door.hpp"
#include "open/result.hpp"
#include "signal/error_vectors.hpp"

namespace doors {
namespace {

constexpr std::uint64_t least_for_search = 64;

lumra_evm_options checked_options(const lumra_evm_options *given) {
  const auto options = read_options(given, lumra_evm_options LUMRA_EVM_OPTIONS);
  constexpr std::uint32_t all = LUMRA_ALIGN_GAIN | LUMRA_ALIGN_DELAY | LUMRA_ALIGN_FREQUENCY | LUMRA_ALIGN_DC;
  require((options.align & ~all) == 0, LUMRA_UNKNOWN_CHOICE, "options->align is ", options.align,
          "; it is a sum of enum lumra_align");
  require(std::isfinite(options.sample_rate_hz) && options.sample_rate_hz > 0, LUMRA_OUT_OF_RANGE,
          "options->sample_rate_hz is ", options.sample_rate_hz, "; it is above 0 and finite");
  return options;
}

lumra_evm_result result_of(const dsp::error_figures &figures, double sample_rate_hz) {
  lumra_evm_result result{};
  result.first = figures.compared.first;
  result.samples = figures.compared.count();
  result.rms = figures.rms;
  result.peak = std::sqrt(figures.peak.power);
  result.magnitude_rms = figures.magnitude_rms;
  result.phase_rms = figures.phase_rms;
  result.peak_index = figures.peak.position;
  result.reference_rms = figures.reference_rms;
  result.gain_re = figures.model.gain.real();
  result.gain_im = figures.model.gain.imag();
  result.delay_samples = figures.model.delay;
  result.frequency_hz = figures.model.frequency * sample_rate_hz;
  result.dc_re = figures.model.dc.real();
  result.dc_im = figures.model.dc.imag();
  return result;
}

void require_measured(dsp::error_outcome outcome) {
  require(outcome != dsp::error_outcome::silent_reference, LUMRA_OUT_OF_RANGE,
          "the reference is zero, or its power is; errors are fractions of its RMS");
  require(outcome != dsp::error_outcome::unrelated, LUMRA_NO_CONVERGENCE,
          "the recordings seem unrelated: no alignment within 500 samples makes them alike; check that they are of the "
          "same signal and finite");
  require(outcome != dsp::error_outcome::undetermined, LUMRA_NO_CONVERGENCE,
          "what is to be aligned cannot be told apart, as with a reference that is a tone; ask for less");
}

template <class Complex, class Real>
lumra_status measure(const char *function, const Complex *reference, const Complex *measured, std::uint64_t n,
                     const lumra_evm_options *given, lumra_evm_result *result, Complex *error, Real *magnitude,
                     Real *phase) noexcept {
  return enter(function, [&] {
    const lumra_evm_options options = checked_options(given);
    const auto from = array(samples(reference), n, "reference"), to = array(samples(measured), n, "measured");
    require_sized(result, "result");
    using bytes = std::span<const std::byte>;
    const auto bytes_of = [n](const void *first, std::size_t size) {
      return bytes(static_cast<const std::byte *>(first), first ? static_cast<std::size_t>(n) * size : 0);
    };
    const std::array<std::pair<std::string_view, bytes>, 6> arrays{
        {{"reference", std::as_bytes(from)},
         {"measured", std::as_bytes(to)},
         {"result", {reinterpret_cast<const std::byte *>(result), result->size}},
         {"error", bytes_of(error, sizeof *error)},
         {"magnitude", bytes_of(magnitude, sizeof *magnitude)},
         {"phase", bytes_of(phase, sizeof *phase)}}};
    for (std::size_t k = 2; k < arrays.size(); ++k)
      for (std::size_t j = 0; j < k; ++j) {
        const bool both = !arrays[k].second.empty() && !arrays[j].second.empty();
        if (both) require_apart(arrays[k].second, arrays[k].first, arrays[j].second, arrays[j].first);
      }
    const dsp::alignment wanted{(options.align & LUMRA_ALIGN_GAIN) != 0, (options.align & LUMRA_ALIGN_DELAY) != 0,
                                (options.align & LUMRA_ALIGN_FREQUENCY) != 0, (options.align & LUMRA_ALIGN_DC) != 0};
    const std::uint64_t least = wanted.searched() ? least_for_search : 1;
    require(n >= least, LUMRA_TOO_FEW_SAMPLES, "n is ", n, "; this alignment takes ", least, " samples or more");
    dsp::error_figures figures;
    require_measured(dsp::measure_errors<Real>(from, to, wanted, {samples(error), magnitude, phase}, figures));
    give_result(result, result_of(figures, options.sample_rate_hz));
  });
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_evm_measure_cf32(const lumra_cf32 *reference, const lumra_cf32 *measured, uint64_t n,
                                    const lumra_evm_options *options, lumra_evm_result *result, lumra_cf32 *error,
                                    float *magnitude, float *phase) {
  return measure(__func__, reference, measured, n, options, result, error, magnitude, phase);
}

lumra_status lumra_evm_measure_cf64(const lumra_cf64 *reference, const lumra_cf64 *measured, uint64_t n,
                                    const lumra_evm_options *options, lumra_evm_result *result, lumra_cf64 *error,
                                    double *magnitude, double *phase) {
  return measure(__func__, reference, measured, n, options, result, error, magnitude, phase);
}
