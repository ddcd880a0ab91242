// The first pass of long transforms. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"
#include "signal/sample_type.hpp"

namespace dsp {

/// A pass of radix 16 leaves rows that fit the caches, whose transforms are the rest of a long one: row r has bins r,
/// r + 16, r + 32 and so on. Nothing changes it, and all threads may use it.
template <class Real>
class radix_pass {
 public:
  using bin = std::complex<Real>;
  static constexpr std::size_t radix = qsrfhs::kernels::radix, group = qsrfhs::kernels::radix_group;
  static constexpr std::size_t multiple = radix * group;

  /// None.
  radix_pass() = default;
  /// For a multiple of `multiple` points. Throws std::bad_alloc.
  explicit radix_pass(std::size_t points);

  [[nodiscard]] std::size_t row() const noexcept { return plan_.row; }  // points
  /// From a row to the next in memory.
  [[nodiscard]] std::size_t stride() const noexcept { return plan_.stride; }

  /// With a window in the kernels' order, or null for none.
  [[nodiscard]] qsrfhs::kernels::radix_plan<Real> with(const Real *window) const noexcept {
    return {plan_.row, plan_.stride, window, plan_.near, plan_.far};
  }

 private:
  qsrfhs::kernels::radix_plan<Real> plan_{};
  qsrfhs::aligned_buffer<Real> near_, far_;
};

/// Whether a transform of so many points begins with the pass: where it costs less than what one transform of all of them
/// loses to the second-level cache, and rows are whole groups, those of real samples up to half the rate, too. Saved
/// spectra hold the rows: another answer needs another version of them.
template <class Sample>
[[nodiscard]] constexpr bool is_split(std::size_t points) noexcept {
  constexpr std::size_t least = sizeof(real_of<Sample>) == sizeof(double) ? 2048 : 4096;
  return points >= least && points % (radix_pass<real_of<Sample>>::multiple * (is_complex<Sample> ? 1 : 2)) == 0;
}

}  // namespace dsp
