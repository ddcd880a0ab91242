// Error vectors of two streams. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <span>

#include "signal/evm_alignment.hpp"
#include "signal/level.hpp"

namespace dsp {

/// Values a sample, as many as the record has; null where not wanted.
template <class Real>
struct error_traces {
  std::complex<Real> *error = nullptr;
  Real *magnitude = nullptr, *phase = nullptr;
};

struct error_figures {
  stretch compared{0, 0};
  stream_model model;
  double reference_rms = 0;
  double rms = 0, magnitude_rms = 0, phase_rms = 0;  // of the reference's RMS, and radians
  power_peak peak;                                   // square of the largest error, position in the record
};

enum class error_outcome { measured, silent_reference, unrelated, undetermined };

/// Aligns what is wanted of `measured` with a reference as long, and compares them. The traces are written only where
/// it returns `measured`. Throws std::bad_alloc, dfti_failure.
template <class Real>
error_outcome measure_errors(std::span<const std::complex<Real>> reference,
                             std::span<const std::complex<Real>> measured, const alignment &wanted,
                             const error_traces<Real> &traces, error_figures &figures);

}  // namespace dsp
