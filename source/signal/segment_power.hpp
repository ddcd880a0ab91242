// Powers of windowed segments. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <span>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/block_transform.hpp"
#include "signal/dfti_descriptor.hpp"
#include "signal/power_forest.hpp"

namespace dsp {

/// The powers |X[k]|^2 of segments times a window, one after the other, each while the next one is windowed: bins from
/// 0 on, those of real samples up to half the rate. One thread at a time, which holds mkl_runtime::use. Throws
/// dfti_failure.
template <class Sample>
class segment_power {
 public:
  using real = real_of<Sample>;

  /// A window of as many values as a segment, which stay where they are. Throws std::bad_alloc, too.
  explicit segment_power(std::span<const real> window);

  [[nodiscard]] static std::size_t bins(std::size_t points) noexcept {
    return is_complex<Sample> ? points : points / 2 + 1;
  }

  /// The first segment of a run.
  void begin(const Sample *x) noexcept;
  /// Writes the powers of the segment that was begun, or adds them, and begins the next one, unless that is null.
  /// `ahead` is how many of its samples behind the next segment the caches are asked for. Single-precision powers of
  /// complex samples stand in the kernels' order. To be called inside of the section.
  void finish(real *power, row_goes how, const Sample *next, std::size_t ahead, const qsrfhs::mkl_section &around);

  /// Puts powers into the order of the bins, or out of it.
  static void order(std::span<real> power) noexcept;

 private:
  std::span<const real> window_;
  qsrfhs::aligned_buffer<Sample> work_;
  qsrfhs::aligned_buffer<std::complex<real>> spectrum_;  // of real samples
  dfti_descriptor transform_;
};

}  // namespace dsp
