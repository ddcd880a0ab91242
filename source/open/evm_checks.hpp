// What the functions of error vectors check and give in one way. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/evm.h>

#include <array>
#include <cmath>
#include <cstdint>
#include <span>
#include <string_view>
#include <utility>

#include "open/door.hpp"
#include "signal/error_vectors.hpp"

namespace doors {

inline dsp::alignment checked_alignment(std::uint32_t align) {
  constexpr std::uint32_t all = LUMRA_ALIGN_GAIN | LUMRA_ALIGN_DELAY | LUMRA_ALIGN_FREQUENCY | LUMRA_ALIGN_DC;
  require((align & ~all) == 0, LUMRA_UNKNOWN_CHOICE, "options->align is ", align, "; it is a sum of enum lumra_align");
  return {(align & LUMRA_ALIGN_GAIN) != 0, (align & LUMRA_ALIGN_DELAY) != 0, (align & LUMRA_ALIGN_FREQUENCY) != 0,
          (align & LUMRA_ALIGN_DC) != 0};
}

/// The traces of n samples, null or apart from each other, the streams, and the result.
template <class Sample, class Complex, class Real>
void require_traces_apart(std::span<const Sample> reference, std::span<const Sample> measured,
                          std::span<const std::byte> result, const Complex *error, const Real *magnitude,
                          const Real *phase) {
  using bytes = std::span<const std::byte>;
  const auto bytes_of = [n = reference.size()](const void *first, std::size_t size) {
    return bytes(static_cast<const std::byte *>(first), first ? n * size : 0);
  };
  const std::array<std::pair<std::string_view, bytes>, 6> arrays{{{"reference", std::as_bytes(reference)},
                                                                  {"measured", std::as_bytes(measured)},
                                                                  {"result", result},
                                                                  {"error", bytes_of(error, sizeof *error)},
                                                                  {"magnitude", bytes_of(magnitude, sizeof *magnitude)},
                                                                  {"phase", bytes_of(phase, sizeof *phase)}}};
  for (std::size_t k = 2; k < arrays.size(); ++k)
    for (std::size_t j = 0; j < k; ++j) {
      const bool both = !arrays[k].second.empty() && !arrays[j].second.empty();
      if (both) require_apart(arrays[k].second, arrays[k].first, arrays[j].second, arrays[j].first);
    }
}

inline lumra_evm_result result_of(const dsp::error_figures &figures, double sample_rate_hz) {
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

inline void require_measured(dsp::error_outcome outcome) {
  require(outcome != dsp::error_outcome::silent_reference, LUMRA_OUT_OF_RANGE,
          "the reference is zero, or its power is; errors are fractions of its RMS");
  require(outcome != dsp::error_outcome::unrelated, LUMRA_NO_CONVERGENCE,
          "the recordings seem unrelated: no alignment within 500 samples makes them alike; check that they are of the "
          "same signal and finite");
  require(outcome != dsp::error_outcome::undetermined, LUMRA_NO_CONVERGENCE,
          "what is to be aligned cannot be told apart, as with a reference that is a tone; ask for less");
}

}  // namespace doors
