// Element loops, each built from one body for several kinds of processors, and for the richer ones twice: exact, with
// every operation rounded by itself, and with fused products. All exact builds give the same bits (a NaN may differ in
// sign and payload) but for polynomial_reach and the sum of sum_power_and_peak, which the baseline build has otherwise
// than all others; all fused builds give the same bits as each other. Pointers and counts only; complex data are pairs
// of floats, I then Q. An output may be an input, element for element.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

namespace qsrfhs::kernels {

/// Gains at keys start + k * step. An entry is a value and its slope for one step, both complex, or a value.
struct lookup_table {
  const float *entries;
  int count;  // of entries, at least 1
  float start, step;
};

/// Where an output takes its samples, and where its first tap lies.
template <class Real>
struct tap_place {
  std::int32_t first, count;  // samples
  std::int32_t row;           // of taps, or the coefficient in front of the tap
  Real fraction;              // of the way to the next
};

/// Groups of eight taps: their values in a group of eight, then their slopes, for each row `length` / 8 times. At
/// `fraction` a tap is value + fraction * slope.
template <class Real>
struct tap_rows {
  const Real *taps;
  std::int32_t length;  // of a row, a multiple of 8
};

/// Taps that lie at place + offset in a prototype of 2 to 2^24 coefficients, interpolated linearly.
struct tap_offsets {
  const float *prototype;
  float last_pair;       // index of the last coefficient but one
  const float *offsets;  // groups of eight: whole parts, then fractions, each at most 1
  /// The coefficients at each tap's whole part, or at the last pair, and their slopes to the next ones, for each row of
  /// the places and one more; or null, where the prototype is read.
  tap_rows<float> at_rows;
};

/// Where an output takes its samples, and where it lies between the middle two of them.
template <class Real>
struct sample_place {
  std::uint32_t first;  // sample
  std::uint32_t row;    // of taps
  Real offset;          // from the middle of what the row is for
};

/// Taps as polynomials of the offset. For each 32 bytes of taps stand their coefficients of power 3, then those of
/// powers 2, 1 and 0. For complex samples each tap stands twice.
template <class Real>
struct cubic_taps {
  const Real *coefficients;
  std::size_t length;  // taps in a row, a multiple of 32 bytes
};

/// Where tap k of eight stands for complex samples, so that taps can be doubled within the halves of a register.
constexpr int complex_tap_order[8] = {0, 1, 4, 5, 2, 3, 6, 7};

/// A linear recursion that goes on by blocks of eight samples: outputs are sums over the values of a state in front of
/// the block and over the block's samples up to their own, and so is the state behind the block over all of them. For
/// complex samples each value of the tables stands twice, in a row.
struct block_recursion {
  static constexpr std::size_t most_order = 16;
  std::size_t order;         // values of the state, 1 to most_order
  const double *shares;      // 8 x 8: what each sample adds to the outputs, 0 to those in front of it
  const double *responses;   // order, made even, x 8: what each value of the state adds to them
  const double *gathering;   // 8 x width_of(order): what each sample leaves in the state behind the block
  const double *transition;  // order, made even, x width_of(order): what each value of the state leaves there
  /// Values of a state in memory, the last ones 0; complex ones are two `parts` each.
  [[nodiscard]] static constexpr std::size_t width_of(std::size_t order, std::size_t parts) noexcept {
    const std::size_t room = order <= 4 ? 4 : (order + 7) / 8 * 8;
    return room * parts < 8 ? 8 : room * parts;
  }
};

/// Angles of a table, all turned by one.
struct turned_angles {
  const double *cosines, *sines;  // of the table
  double cosine, sine;            // of the turn
};

/// The first pass of a transform of radix * row points, for samples x[r * row + n].
template <class Real>
struct radix_plan {
  std::size_t row, stride;  // samples in a row, a multiple of radix_group, and from a row to the next of the results
  const Real *window;       // for each group of columns n, the values for row 0, then for row 1, and so on; or none
  // Factors whose products are the twiddle factors exp(-2 pi j k n / (radix row)), 1 for k = 0:
  const Real *near;  // for each k, those of the first group: real parts, then imaginary ones
  const Real *far;   // for each group, those of its first column, for each k: complex
};
inline constexpr std::size_t radix = 16, radix_group = 16;

/// Elements of a call, and of all calls that threads share the same arrays in: where all together leave the caches,
/// complex outputs are stored past them.
struct part_of_all {
  std::size_t count, all;
  constexpr part_of_all(std::size_t n) noexcept : count(n), all(n) {}  // a call that is alone
  constexpr part_of_all(std::size_t n, std::size_t of) noexcept : count(n), all(of) {}
};

struct kernel_table {
  /// out[k] = x[k], n complex.
  void (*copy)(const float *x, float *out, std::size_t n);
  /// out[k] = x[k] * w[k], n complex by real.
  void (*apply_window)(const float *x, const float *w, float *out, std::size_t n);
  /// power[k] = re(x[k])^2 + im(x[k])^2, or is increased by it, n complex. Until order_power, the powers stand in an
  /// order of the build's own.
  void (*store_power)(const float *x, float *power, std::size_t n);
  void (*accumulate_power)(const float *x, float *power, std::size_t n);
  /// store_power or accumulate_power of what `work` holds, then apply_window of `next` into `work`, in one pass over
  /// `work`. Meanwhile asks the caches for the ahead_count samples at `ahead`.
  void (*store_power_then_apply_window)(float *work, float *power, const float *next, const float *w,
                                        const float *ahead, std::size_t ahead_count, std::size_t n);
  void (*accumulate_power_then_apply_window)(float *work, float *power, const float *next, const float *w,
                                             const float *ahead, std::size_t ahead_count, std::size_t n);
  /// Puts powers into their order, or out of it again, n real.
  void (*order_power)(float *power, std::size_t n);
  /// out[k * stride + n] = exp(-2 pi j k n / (16 row)) times the sum over r < 16 of
  /// x[r * row + n] w[r * row + n] exp(-2 pi j k r / 16), for k < 16 and n < row; x apart from out. The transforms of
  /// `row` points of the rows k then have bins k, k + 16, k + 32 and so on of the transform of all.
  void (*windowed_radix_16)(const float *x, const radix_plan<float> &plan, float *out);
  void (*windowed_radix_16_double)(const double *x, const radix_plan<double> &plan, double *out);
  /// The same without a window.
  void (*radix_16)(const float *x, const radix_plan<float> &plan, float *out);
  void (*radix_16_double)(const double *x, const radix_plan<double> &plan, double *out);
  /// With a window and real x, for k from 0 to 8: bins of k above 8 are conjugates of those of 16 - k.
  void (*windowed_real_radix_16)(const float *x, const radix_plan<float> &plan, float *out);
  void (*windowed_real_radix_16_double)(const double *x, const radix_plan<double> &plan, double *out);
  /// out[i] = bin first + i times w[i], as weigh_and_rotate, n complex. Bin 16 n + k is rows[k * stride + n]. Reads rows
  /// up to a multiple of 8 bins each.
  void (*weigh_and_rotate_rows)(const float *rows, std::size_t stride, std::size_t first, const float *w, float c,
                                float s, float *out, std::size_t n);
  /// sum[k] += x[k], n real.
  void (*add)(const float *x, float *sum, std::size_t n);

  /// out[k] = conj(x[n - 1 - k]), n complex. x and out share no memory.
  void (*reverse_conjugate)(const float *x, float *out, std::size_t n);
  /// out[k] = (re(x[k])^2 + im(x[k])^2) * factor, n complex, the product in double precision. `mirror`, unless null,
  /// receives the same values in reverse order.
  void (*scaled_power)(const float *x, float *out, float *mirror, double factor, std::size_t n);
  /// out[k] = a[k] * b[k], n complex. a and b may be the same.
  void (*multiply)(const float *a, const float *b, float *out, std::size_t n);
  /// x[k] *= factor, n real.
  void (*scale)(float *x, float factor, std::size_t n);
  /// x[k] = x[k] * factor + offset, n real.
  void (*scale_and_shift)(float *x, float factor, float offset, std::size_t n);

  /// out[k] = x[k] / y[k], n complex.
  void (*divide)(const float *x, const float *y, float *out, part_of_all n);
  /// out[k] = x[k] / v, n complex by one complex.
  void (*divide_by_value)(const float *x, const float *v, float *out, part_of_all n);
  /// out[k] = |x[k]|, and |x[k]|^2, n complex to real.
  void (*magnitude)(const float *x, float *out, std::size_t n);
  void (*magnitude_squared)(const float *x, float *out, std::size_t n);

  /// Samples, from the first, that a real polynomial of m coefficients evaluates of n; the baseline build differs.
  std::size_t (*polynomial_reach)(const float *out, std::size_t n, std::size_t m);
  /// out[k] = c[0] + c[1] x[k] + ... + c[m - 1] x[k]^(m - 1), n real; m at least 1, c apart from out.
  void (*polynomial)(const float *x, const float *c, std::size_t m, float *out, std::size_t n);
  /// The same with complex c and out.
  void (*complex_polynomial)(const float *x, const float *c, std::size_t m, float *out, part_of_all n);

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
  void (*lookup)(const lookup_table &table, const float *keys, const float *in, float *out, part_of_all n);
  /// The same, where an entry is a gain alone and the slope the difference to the next; of one gain there are two alike.
  void (*lookup_between)(const lookup_table &table, const float *keys, const float *in, float *out, part_of_all n);

  /// out[k] = x[k] * w[k], real parts and imaginary parts each with their own weight, n complex.
  void (*weigh)(const float *x, const float *w, float *out, std::size_t n);
  /// weigh, then times (c + js).
  void (*weigh_and_rotate)(const float *x, const float *w, float c, float s, float *out, std::size_t n);

  // Outputs of a filter with taps between the coefficients of a prototype: out[k] = sum over j < count of tap j times
  // x[first + j]. Samples can be read, not only used, up to a multiple of 8 taps.

  /// Taps in rows.
  void (*polyphase)(const tap_place<float> *places, std::size_t outputs, const tap_rows<float> &rows, const float *x,
                    float *out);
  /// The same with complex x and out, taps in complex_tap_order.
  void (*complex_polyphase)(const tap_place<float> *places, std::size_t outputs, const tap_rows<float> &rows,
                            const float *x, float *out);
  /// Taps at offsets, not more than those have room for.
  void (*stretched)(const tap_place<float> *places, std::size_t outputs, const tap_offsets &taps, const float *x,
                    float *out);
  /// The same with complex x and out, offsets in complex_tap_order.
  void (*complex_stretched)(const tap_place<float> *places, std::size_t outputs, const tap_offsets &taps,
                            const float *x, float *out);

  // out[k] = sum over j < count, in this order, of taps[j] * x[k - j], for n outputs apart from x. 32 bytes behind the
  // last sample can be read, not only used.

  /// Values that are `width` apart, n of them in all: 1 for real samples, 2 for complex ones.
  void (*fir)(const float *x, const float *taps, std::size_t count, std::size_t width, float *out, std::size_t n);
  void (*fir_double)(const double *x, const double *taps, std::size_t count, std::size_t width, double *out,
                     std::size_t n);
  /// Complex taps, samples and outputs.
  void (*complex_fir)(const float *x, const float *taps, std::size_t count, float *out, std::size_t n);
  void (*complex_fir_double)(const double *x, const double *taps, std::size_t count, double *out, std::size_t n);

  /// out[k] = a[k] * b[k], n complex.
  void (*multiply_double)(const double *a, const double *b, double *out, std::size_t n);

  /// out[k] = sum over the taps of a row at its offset, times the samples from first on. Samples are `width` values
  /// each: 1 for real samples, 2 for complex ones.
  void (*interpolate)(const sample_place<float> *places, std::size_t outputs, const cubic_taps<float> &taps,
                      std::size_t width, const float *x, float *out);
  void (*interpolate_double)(const sample_place<double> *places, std::size_t outputs, const cubic_taps<double> &taps,
                             std::size_t width, const double *x, double *out);

  /// Turns n samples into outputs, in place. Zeros stand behind them, up to a whole block. The state goes on to the end
  /// of the last whole block. Samples are finite: where one is not, the outputs of its block in front of it become NaN,
  /// too. Outputs are the same bits wherever a stream is cut between blocks.
  void (*recursion)(const block_recursion &plan, std::size_t n, double *data, double *state);
  /// The same with complex samples and state.
  void (*complex_recursion)(const block_recursion &plan, std::size_t n, double *data, double *state);

  /// Floats to doubles that are apart from them, and back, n real.
  void (*widen)(const float *x, double *out, std::size_t n);
  void (*narrow)(const double *x, float *out, std::size_t n);
  /// Whether none of n real is an infinity or a NaN.
  bool (*is_finite)(const double *x, std::size_t n);

  /// out[k] = x[k] * w[k], n real.
  void (*weigh_double)(const double *x, const double *w, double *out, std::size_t n);
  /// rising[k] *= w and falling[n - 1 - k] *= w, where w is a polynomial of `terms` coefficients, that of power 0 first,
  /// at the square of the sine of angle k, computed in double precision. There are angles up to a multiple of 8. `terms`
  /// is 2, 3, 4, 5 or 7; rising and falling lie apart. Nothing is fused in any build.
  void (*cosine_window)(const turned_angles &angles, const double *polynomial, std::size_t terms, float *rising,
                        float *falling, std::size_t n);
  void (*cosine_window_double)(const turned_angles &angles, const double *polynomial, std::size_t terms, double *rising,
                               double *falling, std::size_t n);
  void (*complex_cosine_window)(const turned_angles &angles, const double *polynomial, std::size_t terms, float *rising,
                                float *falling, std::size_t n);
  void (*complex_cosine_window_double)(const turned_angles &angles, const double *polynomial, std::size_t terms,
                                       double *rising, double *falling, std::size_t n);
};

extern const kernel_table baseline_kernels;
extern const kernel_table avx_kernels;
extern const kernel_table avx2_kernels, avx2_fused_kernels;
extern const kernel_table avx512_kernels, avx512_fused_kernels;

/// The kernels for a kind of processors; `fused` is `exact` where there are no fused products.
struct build {
  const char *name;
  const kernel_table *exact, *fused;
};

/// The builds that this processor can run, from the baseline to the widest.
std::span<const build> builds() noexcept;

/// The tables for this processor, from one build, chosen once. Exact ones for all that an older function returns, or
/// shares with a new one.
const kernel_table &exact() noexcept;
const kernel_table &fused() noexcept;

}  // namespace qsrfhs::kernels
