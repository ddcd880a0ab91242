// Element loops, each built twice from one body: for AVX and for the baseline. Both builds give the same bits (a NaN
// may differ in sign and payload) but for polynomial_reach and the sum of sum_power_and_peak. Pointers and counts only;
// complex data are pairs of floats, I then Q. An output may be an input, element for element.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>

namespace qsrfhs::kernels {

/// Gains at keys start + k * step. An entry is a value and its slope for one step, both complex.
struct lookup_table {
  const float *entries;
  int count;  // of entries, at least 1
  float start, step;
};

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

  /// out[k] = conj(x[n - 1 - k]), n complex. x and out share no memory.
  void (*reverse_conjugate)(const float *x, float *out, std::size_t n);
  /// out[k] = (re(x[k])^2 + im(x[k])^2) * factor, n complex, the product in double precision. `mirror`, unless null,
  /// receives the same values in reverse order.
  void (*scaled_power)(const float *x, float *out, float *mirror, double factor, std::size_t n);
  /// a[k] *= b[k], n complex. a and b may be the same.
  void (*multiply)(float *a, const float *b, std::size_t n);
  /// x[k] *= factor, n real.
  void (*scale)(float *x, float factor, std::size_t n);

  /// out[k] = x[k] / y[k], n complex.
  void (*divide)(const float *x, const float *y, float *out, std::size_t n);
  /// out[k] = x[k] / v, n complex by one complex.
  void (*divide_by_value)(const float *x, const float *v, float *out, std::size_t n);
  /// out[k] = |x[k]|, and |x[k]|^2, n complex to real.
  void (*magnitude)(const float *x, float *out, std::size_t n);
  void (*magnitude_squared)(const float *x, float *out, std::size_t n);

  /// Samples, from the first, that a real polynomial of m coefficients evaluates of n; differs between the builds.
  std::size_t (*polynomial_reach)(const float *out, std::size_t n, std::size_t m);
  /// out[k] = c[0] + c[1] x[k] + ... + c[m - 1] x[k]^(m - 1), n real; m at least 1, c apart from out.
  void (*polynomial)(const float *x, const float *c, std::size_t m, float *out, std::size_t n);
  /// The same with complex c and out.
  void (*complex_polynomial)(const float *x, const float *c, std::size_t m, float *out, std::size_t n);

  /// out[k] = a * log2(x[k]) + b, n real; NaN for negative x.
  void (*log2_scaled)(const float *x, float a, float b, float *out, std::size_t n);
  /// The same, but minus infinity for zero x.
  void (*log2_scaled_or_infinity)(const float *x, float a, float b, float *out, std::size_t n);
  /// out[k] = a * log2(|x[k]|^2) + b, n complex to real.
  void (*log2_scaled_power)(const float *x, float a, float b, float *out, std::size_t n);

  /// Sum of |x[k]|^2 over n complex.
  float (*sum_power)(const float *x, std::size_t n);
  /// The sum, in an order of the build's own, and the largest |x[k]|^2, NaNs left out, at least -FLT_MAX.
  void (*sum_power_and_peak)(const float *x, std::size_t n, float *sum, float *peak);

  /// out[k] = in[k] * (gain at keys[k]), n complex.
  void (*lookup)(const lookup_table &table, const float *keys, const float *in, float *out, std::size_t n);

  /// out[k] = x[k] * w[k], real parts and imaginary parts each with their own weight, n complex.
  void (*weigh)(const float *x, const float *w, float *out, std::size_t n);
  /// weigh, then times (c + js).
  void (*weigh_and_rotate)(const float *x, const float *w, float c, float s, float *out, std::size_t n);

  // Samples and taps of dot products can be read, not only used, up to a multiple of 8 floats.

  /// Sum of h[k] * x[k], n real.
  float (*dot)(const float *h, const float *x, std::size_t n);
  /// (1 - fraction) * sum of h0[k] * x[k] + fraction * sum of h1[k] * x[k], n real.
  float (*dot_between)(const float *h0, const float *h1, float fraction, const float *x, std::size_t n);
  /// The same with complex x and sum.
  void (*complex_dot)(const float *h, const float *x, std::size_t n, float *sum);
  void (*complex_dot_between)(const float *h0, const float *h1, float fraction, const float *x, std::size_t n,
                              float *sum);
};

extern const kernel_table avx_kernels;
extern const kernel_table baseline_kernels;

/// The table for this processor, chosen once.
const kernel_table &active() noexcept;

}  // namespace qsrfhs::kernels
