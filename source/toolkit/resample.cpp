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

stream_state checked_kept(const stream_state &state) {
  require(state.ratio > 0 && state.ratio <= largest_ratio, bad_ratio);
  const auto is_fraction = [](double f) { return f >= 0 && f < 1; };
  require(state.delay_whole >= 0 && is_fraction(state.delay_fraction), negative_delay);
  require(is_fraction(state.fraction) && state.fraction == state.at().fraction(), negative_delay);
  require(state.consumed >= 0 && std::isfinite(state.consumed) && state.carried <= state.consumed, negative_delay);
  return state;
}

/// One row of elements or several, under one interface.
template <class E>
struct single_channel {
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

/// Whether a call begins a stream or continues the one in the state, and whether the filter is made wider where
/// outputs are further apart than samples.
enum class stream { begun, continued };
enum class bandwidth { of_input, of_output };

struct resampling_options {
  std::int32_t phases;
  const lumra_resampler_parameters *parameters;
  stream which;
  bandwidth kept;
};

template <class E, class Shape>
struct resampling_inputs {
  typename Shape::in x;
  input<magnitude_of<E>> coefficients;
};

template <class E, class Shape>
struct resampling_outputs {
  typename Shape::out out, sample_history;
  output<magnitude_of<E>> tap_history;
  result<float, failed_result::zero> time;
  kept_state state;

  void clear() noexcept {
    out.clear();
    sample_history.clear();
    tap_history.clear();
    time.clear();
    state.clear();
  }
};

template <class E, class Shape>
void check_arguments(const resampling_inputs<E, Shape> &in, const resampling_options &options,
                     const resampling_outputs<E, Shape> &to) {
  const auto &[x, coefficients] = in;
  require(Shape::view(x).rows >= 1 && Shape::view(x).columns >= 1 && coefficients.count() >= 1, empty_input);
  require(options.phases >= 1 && to.state.present() && (options.parameters || options.which == stream::continued),
          bad_option);
  refuse_sharing(to.sample_history, x, coefficients, to.out, to.tap_history);
  refuse_sharing(to.tap_history, x, coefficients, to.out);
}

/// Both histories, sized for the widest filter, in silence. Returns the position of the first output.
template <class E, class Shape>
position begin_stream(const stream_state &state, double widest_reach, std::int32_t channels,
                      resampling_outputs<E, Shape> &to) {
  const std::int64_t length = 2 * static_cast<std::int64_t>(widest_reach) + 2;
  const auto history = Shape::resize(to.sample_history, channels, length);
  std::fill_n(history.data, history.size(), value_of<E>{});
  to.tap_history.resize(length);
  return position::of(state.delay_fraction) + position::of_whole(state.delay_whole);
}

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
void resample(resampling_inputs<E, Shape> in, const resampling_options &options, resampling_outputs<E, Shape> &to) {
  using real = real_of<E>;
  using value = value_of<E>;
  check_arguments(in, options, to);
  in.coefficients.copy_if_same(to.out);
  in.x.copy_if_same(to.out);
  const matrix_view<const value> block = Shape::view(in.x);

  stream_state state =
      options.which == stream::begun ? checked_reset(*options.parameters) : checked_kept(to.state.load());
  const auto phases = static_cast<double>(options.phases);
  const prototype<real> widest{in.coefficients.values(), phases / std::max(state.ratio, 1.0)};
  require(widest.reach() < 0x1p30, no_memory);
  const prototype<real> filter{widest.h, options.kept == bandwidth::of_output ? widest.step : phases};

  position p = options.which == stream::begun ? begin_stream(state, widest.reach(), block.rows, to) : state.at();
  const matrix_view<value> history = Shape::view(to.sample_history);
  const auto most_taps = static_cast<std::int64_t>(to.tap_history.values().size());
  resampler<E> engine(filter, state.interpolation == 1 ? interpolation::nearest : interpolation::linear, most_taps);
  // No sample in front of the history may be asked for.
  const std::int64_t oldest = std::int64_t{state.carried} - std::max(history.columns, 0);
  const filter_window nearest = engine.around(p);
  require(history.rows == block.rows && nearest.first >= oldest, negative_delay);

  const position ratio = position::of(state.ratio);
  const std::int64_t available = std::int64_t{state.carried} + block.columns;
  const std::int64_t count = output_count(p, ratio, engine.reach(), available);
  const double time = static_cast<double>(p.whole()) + p.fraction() - state.carried + state.consumed;
  to.time.set(static_cast<float>(time));
  const matrix_view<value> result = Shape::resize(to.out, block.rows, count);
  engine.run(p, ratio, {block, {history.data, history.rows, history.columns}, state.carried}, result);
  scale(static_cast<std::int32_t>(result.size()), static_cast<real>(filter.step), result.data);

  remember(history, block);
  state.carried = static_cast<std::int32_t>(available - p.whole());
  state.set(p);
  state.consumed += block.columns;
  to.state.store(state);
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define RESAMPLE(NAME, E, SHAPE, HANDLE)                                                                               \
  int32_t qsRFPELTA_##E##Resample##NAME##H(HANDLE<E> in, handle<magnitude_of<E>> coefficients, int32_t phases,         \
                                           const lumra_resampler_parameters *parameters, int32_t reset,                \
                                           int32_t bandwidthScaling, HANDLE<E> out, float *firstOutputTime,            \
                                           HANDLE<E> sampleHistory, handle<magnitude_of<E>> tapHistory, void *state) { \
    using outputs = resampling_outputs<E, SHAPE<E>>;                                                                   \
    const resampling_options options{phases, parameters, reset != 0 ? stream::begun : stream::continued,               \
                                     bandwidthScaling != 0 ? bandwidth::of_output : bandwidth::of_input};              \
    return toolkit_call(                                                                                               \
        [&](outputs &to) {                                                                                             \
          resample<E, SHAPE<E>>({in, coefficients}, options, to);                                                      \
        },                                                                                                             \
        outputs{SHAPE<E>::out(out), SHAPE<E>::out(sampleHistory), output<magnitude_of<E>>(tapHistory),                 \
                result<float, failed_result::zero>(firstOutputTime), kept_state(state)});                              \
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
