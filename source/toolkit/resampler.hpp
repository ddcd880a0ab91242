// A filter that is moved over a stream to any positions, with taps between the coefficients of its prototype.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cmath>
#include <complex>
#include <cstdint>
#include <span>
#include <type_traits>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "toolkit/element.hpp"
#include "toolkit/frame.hpp"
#include "toolkit/position.hpp"

namespace toolkit {

template <class Real>
struct prototype {
  std::span<const Real> h;
  double step = 1;  // coefficients per input sample

  /// Input samples that the filter reaches to either side.
  [[nodiscard]] double reach() const noexcept { return static_cast<double>(h.size() - 1) / 2 / step; }
};

/// The samples of one channel around a block: index -1 is the newest of the history.
template <class T>
struct channel {
  const T *block, *history_end;
  std::int64_t block_size;

  /// Samples first .. first + count - 1, in `copy` unless all of them lie in the block. Zeros follow the block.
  const T *samples(std::int64_t first, std::int64_t count, T *copy) const noexcept {
    if (first >= 0 && first + count <= block_size) return block + first;
    const std::int64_t old = std::clamp<std::int64_t>(-first, 0, count);
    const std::int64_t fresh = std::clamp<std::int64_t>(block_size - first - old, 0, count - old);
    if (old > 0) std::copy_n(history_end + first, old, copy);
    if (fresh > 0) std::copy_n(block + first + old, fresh, copy + old);
    std::fill(copy + old + fresh, copy + count, T{});
    return copy;
  }
};

/// Where an output takes its samples, and where its first tap lies in the prototype.
struct filter_window {
  std::int64_t first, count;  // samples
  std::int64_t coefficient;   // in front of the first tap
  double fraction;            // of the way to the next coefficient
};

// Dot products of taps and samples, which can be read, not only used, up to a group.

constexpr std::int64_t tap_group = 8;

constexpr std::int64_t in_groups(std::int64_t taps) noexcept {
  return (taps + tap_group - 1) & -tap_group;
}

template <class Real, class T>
void polyphase(const qsrfhs::kernels::tap_place<Real> *places, std::int64_t outputs,
               const qsrfhs::kernels::tap_rows<Real> &rows, const T *x, T *out) noexcept {
  for (; outputs > 0; --outputs, ++places) {
    const Real *taps = rows.taps + std::int64_t{places->row} * 2 * rows.length, fraction = places->fraction;
    const T *in = x + places->first;
    T sum[tap_group] = {};
    std::int64_t left = places->count;
    for (; left >= tap_group; left -= tap_group, taps += 2 * tap_group, in += tap_group)
      for (std::int64_t l = 0; l < tap_group; ++l) sum[l] += (taps[l] + fraction * taps[l + tap_group]) * in[l];
    for (std::int64_t l = 0; l < left; ++l) sum[l] += (taps[l] + fraction * taps[l + tap_group]) * in[l];
    *out++ = ((sum[0] + sum[4]) + (sum[2] + sum[6])) + ((sum[1] + sum[5]) + (sum[3] + sum[7]));
  }
}
inline void polyphase(const qsrfhs::kernels::tap_place<float> *places, std::int64_t outputs,
                      const qsrfhs::kernels::tap_rows<float> &rows, const float *x, float *out) noexcept {
  qsrfhs::kernels::active().polyphase(places, static_cast<std::size_t>(outputs), rows, x, out);
}
inline void polyphase(const qsrfhs::kernels::tap_place<float> *places, std::int64_t outputs,
                      const qsrfhs::kernels::tap_rows<float> &rows, const std::complex<float> *x,
                      std::complex<float> *out) noexcept {
  qsrfhs::kernels::active().complex_polyphase(places, static_cast<std::size_t>(outputs), rows,
                                              reinterpret_cast<const float *>(x), reinterpret_cast<float *>(out));
}

inline void stretched(const qsrfhs::kernels::tap_place<float> *places, std::int64_t outputs,
                      const qsrfhs::kernels::tap_offsets &taps, const float *x, float *out) noexcept {
  qsrfhs::kernels::active().stretched(places, static_cast<std::size_t>(outputs), taps, x, out);
}
inline void stretched(const qsrfhs::kernels::tap_place<float> *places, std::int64_t outputs,
                      const qsrfhs::kernels::tap_offsets &taps, const std::complex<float> *x,
                      std::complex<float> *out) noexcept {
  qsrfhs::kernels::active().complex_stretched(places, static_cast<std::size_t>(outputs), taps,
                                              reinterpret_cast<const float *>(x), reinterpret_cast<float *>(out));
}

/// Outputs depend on their samples alone, not on where a block begins or how many of them are made at once.
template <class E>
class resampler {
 public:
  using real = real_of<E>;
  using value = value_of<E>;

  resampler(const prototype<real> &filter, bool nearest) noexcept
      : h_(filter.h),
        last_(static_cast<std::int64_t>(h_.size()) - 1),
        step_(filter.step),
        whole_step_(std::floor(step_) == step_ ? static_cast<std::int64_t>(step_) : 0),
        nearest_(nearest),
        reach_(whole_step_ > 0 ? position{position::of_whole(last_).units / whole_step_ / 2}
                               : position::of(filter.reach())) {}

  [[nodiscard]] position reach() const noexcept { return reach_; }

  /// The samples of an output at p, which are counted from where p is.
  [[nodiscard]] filter_window around(position p) const noexcept { return between(p - reach_, p + reach_); }

  /// Outputs at p, p + ratio, ... of every channel, whose sample 0 lies at `origin`. Leaves p where the next one is.
  template <class Channels>
  void run(position &p, position ratio, std::int64_t origin, std::int64_t outputs, std::int64_t most_taps,
           std::int32_t channels, Channels channel_of, value *out) {
    const std::int64_t stride = outputs;
    for (const method how = choose(outputs * channels); outputs > 0;) {
      const filter_window start = around(p);
      std::int64_t made = 0;
      if (how == method::alone) {
        require(start.count <= most_taps, history_too_short);
        compute(start, start.first - origin, channels, channel_of, out, stride);
        p = p + ratio;
        made = 1;
      } else {
        const std::int64_t span = plan(p, ratio, std::min(outputs, batch), most_taps, made);
        for (std::int32_t r = 0; r < channels; ++r)
          compute(how, made, channel_of(r).samples(start.first - origin, span, samples_), out + r * stride);
      }
      out += made;
      outputs -= made;
    }
  }

 private:
  static constexpr std::int64_t piece = 256;          // taps at once
  static constexpr std::int64_t batch = 64;           // outputs at once
  static constexpr std::int64_t most_samples = 1024;  // that outputs span together
  static constexpr std::int64_t capacity = 65536 / sizeof(real);

  /// How taps are made: in rows for all phases, between coefficients at offsets, or for every output alone.
  enum class method { rows, offsets, alone };

  static constexpr bool has_offsets = std::is_same_v<real, float>;

  method choose(std::int64_t outputs) noexcept {
    const std::int64_t most_taps = (reach_ + reach_).whole() + 1;
    row_length_ = in_groups(std::min(most_taps, piece));
    if (most_taps > piece) return method::alone;
    if (whole_step_ > 0) {
      if (outputs < whole_step_ || whole_step_ >= capacity / (2 * row_length_)) return method::alone;
      for (std::int64_t q = 0; q <= whole_step_; ++q) fill_row(q, row_length_, taps_ + q * 2 * row_length_);
      return method::rows;
    }
    if (!has_offsets || nearest_ || last_ < 1 || last_ >= 1 << 24) return method::alone;
    for (std::int64_t k = 0; k < row_length_; ++k) {
      const double offset = static_cast<double>(k) * step_, whole = std::floor(offset);
      set_tap(taps_, k, static_cast<real>(whole), static_cast<real>(offset - whole));
    }
    return method::offsets;
  }

  [[nodiscard]] filter_window between(position begin, position end) const noexcept {
    const std::uint64_t behind = -begin.fraction_units();  // from `begin` to the first sample
    filter_window w{};
    w.first = begin.whole() + (behind != 0);
    w.count = end.whole() - w.first + 1;
    if (whole_step_ > 0) {
      const position tap{
          static_cast<wide_integer>(static_cast<wide_unsigned>(behind) * static_cast<std::uint64_t>(whole_step_))};
      w.coefficient = tap.whole();
      w.fraction = tap.fraction();
    } else {
      const double tap = position{static_cast<wide_integer>(behind)}.fraction() * step_;
      w.coefficient = static_cast<std::int64_t>(tap);
      w.fraction = tap - static_cast<double>(w.coefficient);
    }
    return w;
  }

  /// Places of up to `most` outputs; gives the samples that they span.
  std::int64_t plan(position &p, position ratio, std::int64_t most, std::int64_t most_taps, std::int64_t &made) {
    position begin = p - reach_, end = p + reach_;
    const std::int64_t first = between(begin, end).first;
    std::int64_t span = 0, k = 0;
    for (; k < most; ++k, begin = begin + ratio, end = end + ratio) {
      const filter_window w = between(begin, end);
      require(w.count <= most_taps, history_too_short);
      const std::int64_t past = w.first - first + in_groups(w.count);
      if (k > 0 && past > most_samples) break;
      span = std::max(span, past);
      places_[k] = place(w, w.first - first, w.count);
    }
    p = begin + reach_;
    made = k;
    return span;
  }

  [[nodiscard]] qsrfhs::kernels::tap_place<real> place(const filter_window &w, std::int64_t first,
                                                       std::int64_t count) const noexcept {
    const bool next = nearest_ && w.fraction >= 0.5;
    return {static_cast<std::int32_t>(first), static_cast<std::int32_t>(count),
            static_cast<std::int32_t>(w.coefficient + next), nearest_ ? real{} : static_cast<real>(w.fraction)};
  }

  void compute(method how, std::int64_t outputs, const value *x, value *out) noexcept {
    if constexpr (has_offsets) {
      if (how == method::offsets)
        return stretched(places_, outputs, {h_.data(), static_cast<float>(last_ - 1), taps_}, x, out);
    }
    polyphase(places_, outputs, {taps_, static_cast<std::int32_t>(row_length_)}, x, out);
  }

  /// One output of every channel, piece by piece; `first` in the channels' own count.
  template <class Channels>
  void compute(const filter_window &w, std::int64_t first, std::int32_t channels, Channels channel_of, value *out,
               std::int64_t stride) noexcept {
    for (std::int64_t k = 0; k == 0 || k < w.count; k += piece) {
      const std::int64_t count = std::min(piece, w.count - k), length = in_groups(count);
      places_[0] = place(w, 0, count);
      if (whole_step_ > 0)
        fill_row(places_[0].row + k * whole_step_, length, taps_);
      else
        make_taps(static_cast<double>(w.coefficient) + w.fraction, k, length, taps_);
      places_[0].row = 0;
      for (std::int32_t r = 0; r < channels; ++r) {
        value sum;
        compute(method::rows, 1, channel_of(r).samples(first + k, length, samples_), &sum);
        value &y = out[r * stride];
        y = k == 0 ? sum : y + sum;
      }
    }
  }

  // A row holds groups of taps, each followed by the group of their slopes.

  static void set_tap(real *row, std::int64_t k, real tap, real slope) noexcept {
    const std::int64_t group = k / tap_group * 2 * tap_group, lane = k % tap_group;
    const std::int64_t slot = group + (std::is_same_v<E, c> ? qsrfhs::kernels::complex_tap_order[lane] : lane);
    row[slot] = tap;
    row[slot + tap_group] = slope;
  }

  /// Coefficients first, first + step, ..., which all taps lie equally far behind.
  void fill_row(std::int64_t first, std::int64_t length, real *row) const noexcept {
    const auto coefficient = [this](std::int64_t i) { return h_[static_cast<std::size_t>(std::min(i, last_))]; };
    for (std::int64_t k = 0, i = first; k < length; ++k, i += whole_step_) {
      const real tap = i > last_ ? real{} : coefficient(i);
      set_tap(row, k, tap, i > last_ ? real{} : coefficient(i + 1) - tap);
    }
  }

  /// Taps first, first + 1, ... of those at `tap`, `tap` + step, ..., made in double precision.
  void make_taps(double tap, std::int64_t first, std::int64_t length, real *row) const noexcept {
    for (std::int64_t k = 0; k < length; ++k) {
      const double t = std::min(tap + static_cast<double>(first + k) * step_, static_cast<double>(last_));
      const auto i = static_cast<std::int64_t>(nearest_ ? t + 0.5 : t);
      const auto near = static_cast<double>(h_[static_cast<std::size_t>(i)]);
      const auto far = static_cast<double>(h_[static_cast<std::size_t>(std::min(i + 1, last_))]);
      set_tap(row, k, static_cast<real>(nearest_ ? near : near + (t - static_cast<double>(i)) * (far - near)), real{});
    }
  }

  std::span<const real> h_;
  std::int64_t last_;  // coefficient
  double step_;
  std::int64_t whole_step_;  // 0: the step is not whole
  bool nearest_;
  position reach_;
  std::int64_t row_length_ = 0;
  qsrfhs::kernels::tap_place<real> places_[batch];
  value samples_[most_samples];
  real taps_[capacity];
};

}  // namespace toolkit
