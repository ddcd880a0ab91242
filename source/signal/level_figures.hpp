// Sums, extremes and powers of short runs of samples. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <cstdint>

namespace dsp {

/// Samples of a block; the sum of a run does not depend on anything but its samples.
inline constexpr std::size_t level_block = 1024;

struct run_figures {
  double power = 0, dc_re = 0, dc_im = 0;  // sums
  double smallest = 0, largest = 0;        // powers; any where a power is NaN
};

/// Of n samples, 1 to level_block, whose powers are written, too. Sums are in double precision, eight at a time.
template <class Sample>
run_figures measure_run(const Sample *x, std::size_t n, double *power) noexcept;

}  // namespace dsp
