// Resampling of a stream by any ratio, with a prototype filter that is interpolated between its coefficients.
// SPDX-License-Identifier: MIT
#include <lumra/toolkit.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <limits>
#include "toolkit/arithmetic.hpp"
#include "toolkit/frame.hpp"
#include "toolkit/position.hpp"
#include "toolkit/resampler.hpp"

namespace toolkit {
namespace {

constexpr double largest_ratio = 0x1p30, largest_delay = 0x1p31;

/// What a resampler remembers of its stream, besides the histories; see LUMRA_RESAMPLER_STATE_SIZE.
struct stream_state {
  std::int32_t carried;
  std::uint32_t fraction_low, fraction_high;
  std::int32_t interpolation;
  double fraction, ratio, consumed, delay_fraction;
  std::int32_t delay_whole;

  [[nodiscard]] position at() const noexcept {
    return {static_cast<wide_integer>((std::uint64_t{fraction_high} << 32) | fraction_low)};
  }
  /// Only the fraction is kept.
  void set(position p) noexcept {
    fraction_low = static_cast<std::uint32_t>(p.fraction_units());
    fraction_high = static_cast<std::uint32_t>(p.fraction_units() >> 32);
    fraction = p.fraction();
  }
};
static_assert(offsetof(stream_state, interpolation) == 12 && offsetof(stream_state, fraction) == 16 &&
              offsetof(stream_state, delay_whole) + sizeof(std::int32_t) == LUMRA_RESAMPLER_STATE_SIZE);

/// The caller's state, of any alignment; a failure clears it.
class kept_state {
 public:
  explicit kept_state(void *memory) noexcept : memory_(memory) {}
  [[nodiscard]] bool present() const noexcept { return memory_ != nullptr; }
  [[nodiscard]] stream_state load() const noexcept {
    stream_state state{};
    std::memcpy(&state, memory_, LUMRA_RESAMPLER_STATE_SIZE);
    return state;
  }
  void store(const stream_state &state) noexcept { std::memcpy(memory_, &state, LUMRA_RESAMPLER_STATE_SIZE); }
  void clear() noexcept {
    if (memory_) std::memset(memory_, 0, LUMRA_RESAMPLER_STATE_SIZE);
  }

 private:
  void *memory_;
};

/// A result that a failure makes 0. A null address is allowed.
class first_time {
 public:
  explicit first_time(float *address) noexcept : address_(address) {}
  void set(double time) noexcept {
    if (address_) *address_ = static_cast<float>(time);
  }
  void clear() noexcept { set(0); }

 private:
  float *address_;
};

/// The number of outputs whose samples are all there: the smallest n >= 0 with p + n ratio + reach >= available.
std::int64_t output_count(position p, position ratio, position reach, std::int64_t available) noexcept {
  const wide_integer room = position::of_whole(available).units - p.units - reach.units;
  if (room <= 0) return 0;
  const wide_integer count = (room - 1) / std::max<wide_integer>(ratio.units, 1) + 1;
  return static_cast<std::int64_t>(std::min<wide_integer>(count, std::numeric_limits<std::int64_t>::max()));
}

stream_state checked_reset(const lumra_resampler_parameters &given) {
  const auto ratio = static_cast<double>(given.ratio), delay = static_cast<double>(given.delay);
  require(ratio > 0 && ratio <= largest_ratio, bad_ratio);
  require(delay >= 0 && delay < largest_delay, negative_delay);
  stream_state state{};
  state.interpolation = given.interpolation;
  state.ratio = ratio;
  state.delay_whole = static_cast<std::int32_t>(delay);
  state.delay_fraction = delay - std::floor(delay);
  return state;
}

void check_kept(const stream_state &state) {
  require(state.ratio > 0 && state.ratio <= largest_ratio, bad_ratio);
  const auto is_fraction = [](double f) { return f >= 0 && f < 1; };
  require(state.delay_whole >= 0 && is_fraction(state.delay_fraction), negative_delay);
  require(is_fraction(state.fraction) && state.fraction == state.at().fraction(), negative_delay);
  require(state.consumed >= 0 && std::isfinite(state.consumed) && state.carried <= state.consumed, negative_delay);
}

/// One row of elements or several, under one interface.
template <class E>
struct single_channel {
  static constexpr bool several = false;
  using in = input<E>;
  using out = output<E>;
  static matrix_view<const value_of<E>> view(const in &x) noexcept { return {x.values().data(), 1, x.count()}; }
  static matrix_view<value_of<E>> view(const out &x) noexcept {
    return {x.values().data(), 1, static_cast<std::int32_t>(x.values().size())};
  }
  static matrix_view<value_of<E>> resize(out &x, std::int32_t, std::int64_t columns) {
    x.resize(columns);
    return view(x);
  }
};

template <class E>
struct several_channels {
  using in = input_matrix<E>;
  using out = output_matrix<E>;
  static matrix_view<const value_of<E>> view(const in &x) noexcept { return x.view(); }
  static matrix_view<value_of<E>> view(const out &x) noexcept { return x.view(); }
  static matrix_view<value_of<E>> resize(out &x, std::int32_t rows, std::int64_t columns) {
    return x.resize(rows, columns);
  }
};

struct resampling_options {
  std::int32_t phases;
  const lumra_resampler_parameters *parameters;
  bool reset, stretched;
};

/// Keeps the newest samples of every channel.
template <class T>
void remember(const matrix_view<T> &history, const matrix_view<const T> &block) noexcept {
  const auto fresh = static_cast<std::int64_t>(std::min(history.columns, block.columns));
  for (std::int32_t r = 0; r < history.rows; ++r) {
    T *const row = history.row(r);
    std::copy(row + fresh, row + history.columns, row);
    std::copy_n(block.row(r) + block.columns - fresh, fresh, row + history.columns - fresh);
  }
}

template <class E, class Shape>
void resample(typename Shape::in x, input<magnitude_of<E>> coefficients, const resampling_options &options,
              typename Shape::out &out, first_time &time, typename Shape::out &sample_history,
              output<magnitude_of<E>> &tap_history, kept_state &kept) {
  using real = real_of<E>;
  using value = value_of<E>;
  require(Shape::view(x).rows >= 1 && Shape::view(x).columns >= 1 && coefficients.count() >= 1, empty_input);
  require(options.phases >= 1 && kept.present() && (options.parameters || !options.reset), bad_option);
  refuse_sharing(sample_history, x, coefficients, out, tap_history);
  refuse_sharing(tap_history, x, coefficients, out);
  coefficients.keep_apart_from(out);
  x.keep_apart_from(out);
  const std::int32_t rows = Shape::view(x).rows, n = Shape::view(x).columns;

  stream_state state = options.reset ? checked_reset(*options.parameters) : kept.load();
  if (!options.reset) check_kept(state);
  const auto phases = static_cast<double>(options.phases);
  const prototype<real> widest{coefficients.values(), phases / std::max(state.ratio, 1.0)};
  require(widest.reach() < 0x1p30, no_memory);
  const prototype<real> filter{widest.h, options.stretched ? widest.step : phases};

  position p = state.at();
  if (options.reset) {
    const std::int64_t length = 2 * static_cast<std::int64_t>(widest.reach()) + 2;
    const auto history = Shape::resize(sample_history, rows, length);
    std::fill_n(history.data, history.size(), value{});
    tap_history.resize(length);
    p = position::of(state.delay_fraction) + position::of_whole(state.delay_whole);
  }
  const auto history = Shape::view(sample_history);
  const auto most_taps = static_cast<std::int64_t>(tap_history.values().size());
  resampler<E> engine(filter, state.interpolation == 1);
  const position ratio = position::of(state.ratio);
  const std::int64_t available = std::int64_t{state.carried} + n;
  // No sample in front of the history may be asked for.
  const filter_window nearest = engine.around(p);
  require(nearest.count <= most_taps, history_too_short);
  require(history.rows == rows && nearest.first - state.carried >= -std::int64_t{std::max(history.columns, 0)},
          negative_delay);

  const std::int64_t count = output_count(p, ratio, engine.reach(), available);
  time.set(static_cast<double>(p.whole()) + p.fraction() - state.carried + state.consumed);
  const auto result = Shape::resize(out, rows, count);
  const auto block = Shape::view(x);
  const auto channel_of = [&](std::int32_t r) {
    return channel<value>{block.row(r), history.row(r) + history.columns, n};
  };
  engine.run(p, ratio, state.carried, count, most_taps, rows, channel_of, result.data);
  scale(static_cast<std::int32_t>(result.size()), static_cast<real>(filter.step), result.data);

  remember<value>(history, block);
  state.carried = static_cast<std::int32_t>(available - p.whole());
  state.set(p);
  state.consumed += n;
  kept.store(state);
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define RESAMPLE(NAME, E, SHAPE, HANDLE)                                                                               \
  int32_t qsRFPELTA_##E##Resample##NAME##H(HANDLE<E> in, handle<magnitude_of<E>> coefficients, int32_t phases,         \
                                           const lumra_resampler_parameters *parameters, int32_t reset,                \
                                           int32_t bandwidthScaling, HANDLE<E> out, float *firstOutputTime,            \
                                           HANDLE<E> sampleHistory, handle<magnitude_of<E>> tapHistory, void *state) { \
    SHAPE<E>::out result(out), samples(sampleHistory);                                                                 \
    output<magnitude_of<E>> taps(tapHistory);                                                                          \
    first_time time(firstOutputTime);                                                                                  \
    kept_state kept(state);                                                                                            \
    const resampling_options options{phases, parameters, reset != 0, bandwidthScaling != 0};                           \
    return toolkit_call([&] { resample<E, SHAPE<E>>(in, coefficients, options, result, time, samples, taps, kept); },  \
                        result, samples, taps, time, kept);                                                            \
  }
#define RESAMPLE_BOTH(E)                   \
  RESAMPLE(C2C, E, single_channel, handle) \
  RESAMPLE(MultiChC2C, E, several_channels, matrix_handle)
RESAMPLE_BOTH(s)
RESAMPLE_BOTH(d)
RESAMPLE_BOTH(c)
RESAMPLE_BOTH(z)
#undef RESAMPLE_BOTH
#undef RESAMPLE
