// A filter that is moved over a stream to any positions, with taps between the coefficients of its prototype.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <span>
#include <type_traits>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "toolkit/element.hpp"
#include "toolkit/frame.hpp"
#include "toolkit/polyphase.hpp"
#include "toolkit/position.hpp"

namespace toolkit {

template <class Real>
struct prototype {
  std::span<const Real> h;
  double step = 1;  // coefficients per input sample

  /// Input samples that the filter reaches to either side.
  [[nodiscard]] double reach() const noexcept { return static_cast<double>(h.size() - 1) / 2 / step; }
};

/// How a tap is made of the coefficients around it.
enum class interpolation { linear, nearest };

/// The samples that are at hand, by channels: a block behind what is remembered of the stream, counted from where
/// positions count.
template <class T>
struct stream_block {
  matrix_view<const T> block, history;  // the last column of the history is the newest of its samples
  std::int64_t origin;                  // sample 0 of the block

  /// Samples first .. first + count - 1 of a channel, in `copy` unless all of them lie in the block. Zeros follow the
  /// block.
  const T *samples(std::int32_t channel, std::int64_t first, std::int64_t count, T *copy) const noexcept {
    first -= origin;
    const T *const in_block = block.row(channel);
    if (first >= 0 && first + count <= block.columns) return in_block + first;
    const std::int64_t old = std::clamp<std::int64_t>(-first, 0, count);
    const std::int64_t fresh = std::clamp<std::int64_t>(block.columns - first - old, 0, count - old);
    if (old > 0) std::copy_n(history.row(channel) + history.columns + first, old, copy);
    if (fresh > 0) std::copy_n(in_block + first + old, fresh, copy + old);
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

/// Outputs depend on their samples alone, not on where a block begins or how many of them are made at once.
template <class E>
class resampler {
 public:
  using real = real_of<E>;
  using value = value_of<E>;

  /// Outputs that take more than `most_taps` samples are refused.
  resampler(const prototype<real> &filter, interpolation between, std::int64_t most_taps) noexcept
      : h_(filter.h),
        last_(static_cast<std::int64_t>(h_.size()) - 1),
        step_(filter.step),
        whole_step_(std::floor(step_) == step_ ? static_cast<std::int64_t>(step_) : 0),
        between_(between),
        most_taps_(most_taps),
        reach_(whole_step_ > 0 ? position{position::of_whole(last_).units / whole_step_ / 2}
                               : position::of(filter.reach())) {}

  [[nodiscard]] position reach() const noexcept { return reach_; }

  /// The samples of an output at p, which are counted from where p is. Throws history_too_short.
  [[nodiscard]] filter_window around(position p) const { return window(p - reach_, p + reach_); }

  /// Fills the columns of `out`, of every channel, with the outputs at p, p + ratio, ... Leaves p where the next one
  /// is. Throws history_too_short, std::bad_alloc.
  void run(position &p, position ratio, const stream_block<value> &in, const matrix_view<value> &out) {
    const tap_source source = prepare(static_cast<std::int64_t>(out.size()));
    for (std::int64_t done = 0; done < out.columns;) {
      if (source == tap_source::own) {
        make_output(around(p), in, out, done);
        p = p + ratio;
        ++done;
      } else {
        const batch next = plan(p, ratio, std::min(out.columns - done, most_together));
        for (std::int32_t r = 0; r < out.rows; ++r)
          make_batch(source, next.outputs, in.samples(r, next.first, next.count, samples_.data()), out.row(r) + done);
        done += next.outputs;
      }
    }
  }

 private:
  static constexpr std::int64_t piece = 256;          // taps at once
  static constexpr std::int64_t most_together = 64;   // outputs of a batch
  static constexpr std::int64_t most_samples = 1024;  // that a batch takes
  static constexpr std::int64_t most_in_rows = 65536 / sizeof(real);

  /// Where taps come from: rows for all phases, offsets between coefficients, or each output's own row.
  enum class tap_source { rows, offsets, own };

  static constexpr bool has_offsets = std::is_same_v<real, float>;

  /// Outputs that are made together, and the samples that they take.
  struct batch {
    std::int64_t outputs, first, count;
  };

  [[nodiscard]] tap_source choose(std::int64_t taps, std::int64_t outputs) const noexcept {
    if (taps > piece) return tap_source::own;
    if (whole_step_ > 0) {
      const bool pays = outputs >= whole_step_ && whole_step_ < most_in_rows / (2 * row_length_);
      return pays ? tap_source::rows : tap_source::own;
    }
    const bool fits = has_offsets && between_ == interpolation::linear && last_ >= 1 && last_ < 1 << 24;
    return fits ? tap_source::offsets : tap_source::own;
  }

  /// Chooses, and makes the taps that all outputs share.
  tap_source prepare(std::int64_t outputs) {
    const std::int64_t taps = (reach_ + reach_).whole() + 1;
    row_length_ = in_groups(std::min(taps, piece));
    const tap_source source = choose(taps, outputs);
    const std::int64_t rows = source == tap_source::rows ? whole_step_ + 1 : 1;
    taps_ = qsrfhs::aligned_buffer<real>(static_cast<std::size_t>(rows * 2 * row_length_));
    samples_ =
        qsrfhs::aligned_buffer<value>(static_cast<std::size_t>(source == tap_source::own ? row_length_ : most_samples));
    if (source == tap_source::rows) {
      for (std::int64_t row = 0; row < rows; ++row) fill_taps(row, row_length_, taps_.data() + row * 2 * row_length_);
    } else if (source == tap_source::offsets) {
      for (std::int64_t k = 0; k < row_length_; ++k) {
        const double offset = static_cast<double>(k) * step_, whole = std::floor(offset);
        set_tap(taps_.data(), k, static_cast<real>(whole), static_cast<real>(offset - whole));
      }
      fill_pairs(outputs);
    }
    return source;
  }

  [[nodiscard]] filter_window window(position begin, position end) const {
    const std::uint64_t behind = -begin.fraction_units();  // from `begin` to the first sample
    filter_window w{};
    w.first = begin.whole() + (behind != 0);
    w.count = end.whole() - w.first + 1;
    require(w.count <= most_taps_, history_too_short);
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

  /// The coefficient that the first tap begins with, and its share of the way to the next one.
  [[nodiscard]] std::int64_t first_coefficient(const filter_window &w) const noexcept {
    return w.coefficient + (between_ == interpolation::nearest && w.fraction >= 0.5 ? 1 : 0);
  }
  [[nodiscard]] real share(const filter_window &w) const noexcept {
    return between_ == interpolation::nearest ? real{} : static_cast<real>(w.fraction);
  }

  /// Places up to `most` outputs from p on; leaves p where the next one is.
  batch plan(position &p, position ratio, std::int64_t most) {
    position begin = p - reach_, end = p + reach_;
    batch made{0, 0, 0};
    for (; made.outputs < most; ++made.outputs, begin = begin + ratio, end = end + ratio) {
      const filter_window w = window(begin, end);
      if (made.outputs == 0) made.first = w.first;
      const std::int64_t past = w.first - made.first + in_groups(w.count);
      if (made.outputs > 0 && past > most_samples) break;
      made.count = std::max(made.count, past);
      places_[static_cast<std::size_t>(made.outputs)] = {static_cast<std::int32_t>(w.first - made.first),
                                                         static_cast<std::int32_t>(w.count),
                                                         static_cast<std::int32_t>(first_coefficient(w)), share(w)};
    }
    p = begin + reach_;
    return made;
  }

  /// The outputs of one channel.
  void make_batch(tap_source source, std::int64_t outputs, const value *x, value *out) const noexcept {
    if constexpr (has_offsets) {
      if (source == tap_source::offsets)
        return stretched(places_.data(), outputs,
                         {h_.data(),
                          static_cast<float>(last_ - 1),
                          taps_.data(),
                          {pairs_.data(), static_cast<std::int32_t>(row_length_)}},
                         x, out);
    }
    polyphase(places_.data(), outputs, {taps_.data(), static_cast<std::int32_t>(row_length_)}, x, out);
  }

  /// One column of `out`, in pieces of the filter; each serves all channels.
  void make_output(const filter_window &w, const stream_block<value> &in, const matrix_view<value> &out,
                   std::int64_t column) noexcept {
    for (std::int64_t k = 0; k == 0 || k < w.count; k += piece) {
      const std::int64_t count = std::min(piece, w.count - k), length = in_groups(count);
      if (whole_step_ > 0)
        fill_taps(first_coefficient(w) + k * whole_step_, length, taps_.data());
      else
        fill_taps_between(static_cast<double>(w.coefficient) + w.fraction, k, length, taps_.data());
      const tap_place<real> place{0, static_cast<std::int32_t>(count), 0, share(w)};
      for (std::int32_t r = 0; r < out.rows; ++r) {
        value sum;
        polyphase(&place, 1, {taps_.data(), static_cast<std::int32_t>(length)},
                  in.samples(r, w.first + k, length, samples_.data()), &sum);
        value &y = out.row(r)[column];
        y = k == 0 ? sum : y + sum;
      }
    }
  }

  // A row of taps holds groups of them, each followed by the group of their slopes.

  static void set_tap(real *row, std::int64_t k, real tap, real slope) noexcept {
    const std::int64_t group = k / tap_group * 2 * tap_group, lane = k % tap_group;
    const std::int64_t slot = group + (std::is_same_v<E, c> ? qsrfhs::kernels::complex_tap_order[lane] : lane);
    row[slot] = tap;
    row[slot + tap_group] = slope;
  }

  /// Coefficients first, first + step, ..., which all taps lie equally far behind.
  void fill_taps(std::int64_t first, std::int64_t length, real *row) const noexcept {
    const auto coefficient = [this](std::int64_t i) { return h_[static_cast<std::size_t>(std::min(i, last_))]; };
    for (std::int64_t k = 0, i = first; k < length; ++k, i += whole_step_) {
      const real tap = i > last_ ? real{} : coefficient(i);
      set_tap(row, k, tap, i > last_ ? real{} : coefficient(i + 1) - tap);
    }
  }

  /// What taps between coefficients are made of, for each place of the first one, where that pays.
  void fill_pairs(std::int64_t outputs) {
    const std::int64_t rows = static_cast<std::int64_t>(step_) + 2;
    if (outputs < 2 * rows || rows > most_in_rows / (2 * row_length_)) return;
    pairs_ = qsrfhs::aligned_buffer<real>(static_cast<std::size_t>(rows * 2 * row_length_));
    for (std::int64_t k = 0; k < row_length_; ++k) {
      const auto whole = static_cast<std::int64_t>(static_cast<double>(k) * step_);
      for (std::int64_t row = 0; row < rows; ++row) {
        const auto i = static_cast<std::size_t>(std::min(whole + row, last_ - 1));
        set_tap(pairs_.data() + row * 2 * row_length_, k, h_[i], h_[i + 1] - h_[i]);
      }
    }
  }

  /// Taps first, first + 1, ... of those at `tap`, `tap` + step, ..., made in double precision.
  void fill_taps_between(double tap, std::int64_t first, std::int64_t length, real *row) const noexcept {
    const bool nearest = between_ == interpolation::nearest;
    for (std::int64_t k = 0; k < length; ++k) {
      const double t = std::min(tap + static_cast<double>(first + k) * step_, static_cast<double>(last_));
      const auto i = static_cast<std::int64_t>(nearest ? t + 0.5 : t);
      const auto near = static_cast<double>(h_[static_cast<std::size_t>(i)]);
      const auto far = static_cast<double>(h_[static_cast<std::size_t>(std::min(i + 1, last_))]);
      set_tap(row, k, static_cast<real>(nearest ? near : near + (t - static_cast<double>(i)) * (far - near)), real{});
    }
  }

  std::span<const real> h_;
  std::int64_t last_;  // coefficient
  double step_;
  std::int64_t whole_step_;  // 0: the step is not whole
  interpolation between_;
  std::int64_t most_taps_;
  position reach_;
  std::int64_t row_length_ = 0;
  std::array<tap_place<real>, most_together> places_;  // of a batch
  qsrfhs::aligned_buffer<value> samples_;              // where they are gathered from history and block
  qsrfhs::aligned_buffer<real> taps_, pairs_;
};

}  // namespace toolkit
