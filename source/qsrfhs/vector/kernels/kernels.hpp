// Element loops, each built twice from one body: for AVX and for the baseline. Both builds give the same bits (a NaN
// may differ in sign and payload). Pointers and counts only; complex data are pairs of floats, I then Q.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>

namespace qsrfhs::kernels {

struct kernel_table {
  /// out[k] = x[k], n complex.
  void (*copy)(const float *x, float *out, std::size_t n);
  /// out[k] = x[k] * w[k], n complex by real.
  void (*apply_window)(const float *x, const float *w, float *out, std::size_t n);
  /// power[k] += re(x[k])^2 + im(x[k])^2, n complex. Until order_power, the powers stand in an order of the build's
  /// own.
  void (*accumulate_power)(const float *x, float *power, std::size_t n);
  /// accumulate_power of what `work` holds, then apply_window of `next` into `work`, in one pass over `work`. Meanwhile
  /// asks the caches for the ahead_count samples at `ahead`.
  void (*accumulate_power_then_apply_window)(float *work, float *power, const float *next, const float *w,
                                             const float *ahead, std::size_t ahead_count, std::size_t n);
  /// Puts accumulated powers into their order, n real.
  void (*order_power)(float *power, std::size_t n);
  /// x[k] *= factor, n real.
  void (*scale)(float *x, float factor, std::size_t n);
};

extern const kernel_table avx_kernels;
extern const kernel_table baseline_kernels;

/// The table for this processor, chosen once.
const kernel_table &active() noexcept;

}  // namespace qsrfhs::kernels
