// Error vectors of two streams. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <span>

#include "signal/evm_totals.hpp"

namespace dsp {

/// Aligns what is wanted of `measured` with a reference as long, and compares them. The traces, fractions of the
/// reference's RMS, are as long; they are written only where it returns `measured`. Uses so many threads at most; 0 for
/// as many as pay. Throws std::bad_alloc, dfti_failure.
template <class Real>
error_outcome measure_errors(std::span<const std::complex<Real>> reference,
                             std::span<const std::complex<Real>> measured, const alignment &wanted, std::size_t threads,
                             const error_traces<Real> &traces, error_figures &figures);

/// Errors under a model that is known, in units of the reference, of samples from a position on. Not more samples than
/// delayed_reference takes where there is a delay. Throws as above.
template <class Real>
void trace_errors(std::span<const std::complex<Real>> reference, std::span<const std::complex<Real>> measured,
                  std::uint64_t position, const stream_model &model, const error_traces<Real> &traces);

}  // namespace dsp
