// How a measured recording differs from a reference, for recordings of any length in constant memory.
// SPDX-License-Identifier: MIT
#pragma once

#include <lumra/evm.h>

#include <complex>
#include <cstdint>
#include <functional>
#include <span>

#include "recording/source.hpp"

namespace tool {

/// Samples of a recording.
struct evm_input {
  const recording::source &source;
  const recording::stretch &over;
};

struct evm_settings {
  std::uint32_t align = LUMRA_ALIGN_NONE;        // sum of enum lumra_align
  std::uint64_t samples = 0;                     // from the start, not more than either recording has
  std::uint64_t block = std::uint64_t{1} << 16;  // samples to read at a time, where no more than the gain is aligned
};

/// Statistics of one kind of error.
struct deviation {
  double rms = 0, mean = 0;
  double peak = 0;            // the largest in magnitude, with its sign
  std::uint64_t peak_at = 0;  // index of its sample
};

/// Error and magnitude error are relative to the RMS of the reference, the phase error is in radians.
struct evm_result {
  double reference_rms = 0;
  std::uint64_t first = 0, samples = 0;  // measured samples that were compared
  // What was found of the alignment, and removed from the measured samples.
  std::complex<double> gain{1, 0}, dc;
  double delay_samples = 0, frequency_hz = 0;
  deviation error, magnitude, phase;
  std::uint64_t without_phase = 0;  // samples that are zero in one of the recordings: no part of the phase error
};

/// A block of samples after the alignment, and its errors.
struct evm_block {
  std::uint64_t first;  // index of the first sample
  std::uint64_t place;  // the same, counted from the first that is compared
  double unit;          // RMS of the reference in which samples, errors and magnitude errors are to be expressed
  std::span<const std::complex<float>> reference, measured;
  std::span<const float> error, magnitude, phase;
};

/// A sample that is zero has no phase.
[[nodiscard]] bool has_phase(std::complex<float> reference, std::complex<float> measured) noexcept;

/// Compares sample by sample, and shows `see` the errors block by block. Both recordings are read several times: for
/// the levels or the alignment, and for the errors. Throws failure, or lumra::error when the library refuses.
evm_result measure_evm(const evm_input &reference, const evm_input &measured, const evm_settings &settings,
                       const std::function<void(const evm_block &)> &see);

}  // namespace tool
