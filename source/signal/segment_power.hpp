// Powers of windowed segments. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/dfti_descriptor.hpp"
#include "signal/power_forest.hpp"
#include "signal/segment_plan.hpp"

namespace dsp {

/// The powers |X[k]|^2 of segments times a window, one after the other, in the plan's order, those of real samples up
/// to half the rate. One thread at a time, which holds mkl_runtime::use. Throws dfti_failure.
template <class Sample>
class segment_power {
 public:
  using real = real_of<Sample>;

  /// The plan stays where it is. Throws std::bad_alloc, too.
  explicit segment_power(const segment_plan<Sample> &plan);

  /// The first segment of a run.
  void begin(const Sample *x) noexcept;
  /// Writes the powers of the segment that was begun, or adds them, and begins the next one, unless that is null.
  /// `ahead` is how many of its samples behind the next segment the caches are asked for. To be called inside of the
  /// section.
  void finish(real *power, row_goes how, const Sample *next, std::size_t ahead, const qsrfhs::mkl_section &around);

 private:
  [[nodiscard]] bool has_real_transform() const noexcept { return !is_complex<Sample> && !plan_.is_split(); }

  const segment_plan<Sample> &plan_;
  qsrfhs::aligned_buffer<Sample> real_;  // the windowed segment, where its transform is one of real samples
  qsrfhs::aligned_buffer<std::complex<real>> rows_;
  dfti_descriptor transform_;
};

}  // namespace dsp
