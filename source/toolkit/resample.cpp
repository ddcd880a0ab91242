// Resampling of a stream by any ratio, with a prototype filter that is interpolated between its coefficients.
// SPDX-License-Identifier: MIT
#include "toolkit/resample.hpp"

#include <emmintrin.h>
#include <lumra/toolkit.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <limits>
#include <span>

#include "toolkit/arithmetic.hpp"
#include "toolkit/frame.hpp"

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

template <class Real>
struct prototype {
  std::span<const Real> h;
  double phases = 1, stretch = 1;

  /// Coefficients per input sample.
  [[nodiscard]] double step() const noexcept { return phases / stretch; }
  [[nodiscard]] double centre() const noexcept { return static_cast<double>(h.size() - 1) / 2; }
  /// Input samples that the filter reaches to either side.
  [[nodiscard]] double reach() const noexcept { return centre() * stretch / phases; }
};

/// Sums of terms 0, 4, 8, ..., of terms 1, 5, 9, ..., and so on. The result depends on the terms alone, not on how they
/// are added in pieces.
template <class Sum>
class sum_in_four {
 public:
  template <class Term>
  void add(std::int64_t begin, std::int64_t end, Term term) noexcept {
    std::int64_t k = begin;
    for (; k < end && k % 4 != 0; ++k) part_[k % 4] += term(k);
    Sum s0 = part_[0], s1 = part_[1], s2 = part_[2], s3 = part_[3];  // in registers
    for (; k + 4 <= end; k += 4) {
      s0 += term(k);
      s1 += term(k + 1);
      s2 += term(k + 2);
      s3 += term(k + 3);
    }
    if (k < end) s0 += term(k);
    if (k + 1 < end) s1 += term(k + 1);
    if (k + 2 < end) s2 += term(k + 2);
    part_[0] = s0, part_[1] = s1, part_[2] = s2, part_[3] = s3;
  }
  [[nodiscard]] Sum total() const noexcept { return (part_[0] + part_[2]) + (part_[1] + part_[3]); }

 private:
  Sum part_[4] = {};
};

// With a whole step all taps of an output lie equally far behind a coefficient: the sum over the coefficients in front
// of the taps and that over those behind them are enough, and no tap has to be made.

/// Products of one sample with two neighbouring coefficients.
template <class Real, class T>
struct product_pair {
  T first{}, second{};

  static product_pair of(const Real *h, const T &x) noexcept { return {h[0] * x, h[1] * x}; }
  product_pair &operator+=(const product_pair &b) noexcept {
    first += b.first;
    second += b.second;
    return *this;
  }
  friend product_pair operator+(product_pair a, const product_pair &b) noexcept { return a += b; }
  [[nodiscard]] T between(Real fraction) const noexcept { return (1 - fraction) * first + fraction * second; }
};

template <>
struct product_pair<float, std::complex<float>> {
  __m128 parts = _mm_setzero_ps();  // first, second

  static product_pair of(const float *h, const std::complex<float> &x) noexcept {
    const __m128 both = _mm_castpd_ps(_mm_load_sd(reinterpret_cast<const double *>(h)));
    const __m128d sample = _mm_load_sd(reinterpret_cast<const double *>(&x));
    return {_mm_mul_ps(_mm_unpacklo_ps(both, both), _mm_castpd_ps(_mm_unpacklo_pd(sample, sample)))};
  }
  product_pair &operator+=(const product_pair &b) noexcept {
    parts = _mm_add_ps(parts, b.parts);
    return *this;
  }
  friend product_pair operator+(product_pair a, const product_pair &b) noexcept { return a += b; }
  [[nodiscard]] std::complex<float> between(float fraction) const noexcept {
    alignas(16) float sums[4];
    _mm_store_ps(sums, parts);
    return {(1 - fraction) * sums[0] + fraction * sums[2], (1 - fraction) * sums[1] + fraction * sums[3]};
  }
};

/// The samples of one channel around a block: index -1 is the newest of the history.
template <class T>
struct channel {
  const T *block, *history_end;

  /// Calls add(x, begin, end) so that x[k] is sample first + k, for k = 0 .. count - 1.
  template <class Add>
  void over(std::int64_t first, std::int64_t count, Add add) const noexcept {
    const std::int64_t old = std::clamp<std::int64_t>(-first, 0, count);
    if (old > 0) add(history_end + first, 0, old);
    if (old < count) add(block + first, old, count);
  }
};

/// Where an output takes its samples, and where its first tap lies in the prototype.
struct window {
  std::int64_t first, count;
  double tap;
};

template <class E>
class resampler {
 public:
  using real = real_of<E>;
  using value = value_of<E>;

  resampler(const prototype<real> &filter, std::int32_t interpolation, std::span<real> taps) noexcept
      : filter_(filter),
        reach_(position::of(filter.reach())),
        step_(filter.step()),
        last_(static_cast<double>(filter.h.size() - 1)),
        nearest_(interpolation == 1),
        whole_step_(filter.stretch == 1 ? static_cast<std::int64_t>(filter.phases) : 0),
        taps_(taps) {}

  [[nodiscard]] position reach() const noexcept { return reach_; }

  /// The samples of an output at p, which are counted from where p is.
  [[nodiscard]] window around(position p) const noexcept {
    const position f{static_cast<wide_integer>(p.fraction_units())};
    const std::int64_t left = (reach_ - f).whole() + 1, right = (reach_ + f).whole();
    const double tap = filter_.centre() - step_ * p.fraction() - static_cast<double>(left - 1) * step_;
    return {p.whole() - left + 1, left + right, std::max(tap, 0.0)};
  }

  /// The output of every channel at a window whose first sample is `first` in the channels' own count.
  template <class Channels>
  void compute(const window &w, std::int64_t first, std::int32_t rows, Channels channel_of, value *out,
               std::int64_t stride) const {
    require(w.count <= static_cast<std::int64_t>(taps_.size()), history_too_short);
    const double floor = std::floor(w.tap);
    const auto index = static_cast<std::int64_t>(floor);
    const bool pairs = whole_step_ > 0 && !nearest_ && w.count > 0 &&
                       index + (w.count - 1) * whole_step_ + 1 < static_cast<std::int64_t>(filter_.h.size());
    if (!pairs) make_taps(w);
    for (std::int32_t r = 0; r < rows; ++r) {
      const channel<value> samples = channel_of(r);
      value &y = out[r * stride];
      if (pairs) {
        sum_in_four<product_pair<real, value>> sum;
        const real *const h = filter_.h.data() + index;
        samples.over(first, w.count, [&](const value *x, std::int64_t begin, std::int64_t end) {
          sum.add(begin, end, [&](std::int64_t k) { return product_pair<real, value>::of(h + k * whole_step_, x[k]); });
        });
        y = sum.total().between(static_cast<real>(w.tap - floor));
      } else {
        sum_in_four<value> sum;
        samples.over(first, w.count, [&](const value *x, std::int64_t begin, std::int64_t end) {
          sum.add(begin, end, [&](std::int64_t k) { return taps_[static_cast<std::size_t>(k)] * x[k]; });
        });
        y = sum.total();
      }
    }
  }

 private:
  void make_taps(const window &w) const noexcept {
    const real *const h = filter_.h.data();
    real *const taps = taps_.data();
    std::int64_t k = 0;
    if (nearest_) {
      const double t = w.tap + 0.5;
      for (; k < w.count; ++k)
        taps[k] = h[static_cast<std::int32_t>(std::min(t + static_cast<double>(k) * step_, last_))];
      return;
    }
    const auto interpolated = [h](double t, std::int32_t ahead) {
      const auto i = static_cast<std::int32_t>(t);
      const auto near = static_cast<double>(h[i]), far = static_cast<double>(h[i + ahead]);
      return static_cast<real>(near + (t - i) * (far - near));
    };
    for (; k < w.count; ++k) {
      const double t = w.tap + static_cast<double>(k) * step_;
      if (t >= last_) break;
      taps[k] = interpolated(t, 1);
    }
    for (; k < w.count; ++k) taps[k] = interpolated(last_, 0);  // at the last coefficient, or beyond it by rounding
  }

  prototype<real> filter_;
  position reach_;
  double step_, last_;
  bool nearest_;
  std::int64_t whole_step_;  // 0: the step is not whole
  std::span<real> taps_;
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
  const auto apart = [](const auto &state, const auto &...others) {
    require(!state.block() || ((others.block() != state.block()) && ...), bad_option);
  };
  apart(sample_history, x, coefficients, out, tap_history);
  apart(tap_history, x, coefficients, out);
  coefficients.keep_apart_from(out);
  x.keep_apart_from(out);
  const std::int32_t rows = Shape::view(x).rows, n = Shape::view(x).columns;

  stream_state state = options.reset ? checked_reset(*options.parameters) : kept.load();
  if (!options.reset) check_kept(state);
  const auto phases = static_cast<double>(options.phases);
  const double limited = std::max(state.ratio, 1.0);
  prototype<real> filter{coefficients.values(), phases, limited};
  const double widest = filter.reach();
  require(widest < 0x1p30, no_memory);
  if (!options.stretched) filter.stretch = 1;

  position p = state.at();
  if (options.reset) {
    const std::int64_t length = 2 * static_cast<std::int64_t>(widest) + 2;
    const auto history = Shape::resize(sample_history, rows, length);
    std::fill_n(history.data, history.size(), value{});
    tap_history.resize(length);
    p = position::of(state.delay_fraction) + position::of_whole(state.delay_whole);
  }
  const auto history = Shape::view(sample_history);
  const resampler<E> engine(filter, state.interpolation, tap_history.values());
  const position ratio = position::of(state.ratio);
  const std::int64_t available = std::int64_t{state.carried} + n;
  // No sample in front of the history may be asked for.
  const window nearest = engine.around(p);
  require(nearest.count <= static_cast<std::int64_t>(tap_history.values().size()), history_too_short);
  require(history.rows == rows && nearest.first - state.carried >= -std::int64_t{std::max(history.columns, 0)},
          negative_delay);

  const std::int64_t count = output_count(p, ratio, engine.reach(), available);
  time.set(static_cast<double>(p.whole()) + p.fraction() - state.carried + state.consumed);
  const auto result = Shape::resize(out, rows, count);
  const auto block = Shape::view(x);
  const auto channel_of = [&](std::int32_t r) {
    return channel<value>{block.row(r), history.row(r) + history.columns};
  };
  for (std::int64_t k = 0; k < count; ++k, p = p + ratio) {
    const window w = engine.around(p);
    engine.compute(w, w.first - state.carried, rows, channel_of, result.data + k, count);
  }
  scale(static_cast<std::int32_t>(result.size()), static_cast<real>(filter.step()), result.data);

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
