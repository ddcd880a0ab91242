// Resampling of a stream by any ratio, with a prototype filter that is interpolated between its coefficients.
// SPDX-License-Identifier: MIT
#include "toolkit/resample.hpp"

#include <emmintrin.h>
#include <lumra/toolkit.h>

#include <algorithm>
#include <cmath>
#include <complex>
#include <cstdint>
#include <cstring>
#include <limits>
#include <span>

#include "qsrfhs/vector/kernels/kernels.hpp"
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

// Dot products of n samples with taps. Samples and taps can be read, not only used, up to a whole group: n rounded up
// to a multiple of 8.

constexpr std::int64_t group = 8;

constexpr std::int64_t in_groups(std::int64_t n) noexcept {
  return (n + group - 1) / group * group;
}

template <class Real, class T>
T dot(const Real *h, const T *x, std::int64_t n) noexcept {
  T s0{}, s1{}, s2{}, s3{};
  std::int64_t k = 0;
  for (; k + 4 <= n; k += 4) {
    s0 += h[k] * x[k];
    s1 += h[k + 1] * x[k + 1];
    s2 += h[k + 2] * x[k + 2];
    s3 += h[k + 3] * x[k + 3];
  }
  for (; k < n; ++k) s0 += h[k] * x[k];
  return (s0 + s2) + (s1 + s3);
}
inline float dot(const float *h, const float *x, std::int64_t n) noexcept {
  return qsrfhs::kernels::active().dot(h, x, static_cast<std::size_t>(n));
}
inline std::complex<float> dot(const float *h, const std::complex<float> *x, std::int64_t n) noexcept {
  float sum[2];
  qsrfhs::kernels::active().complex_dot(h, reinterpret_cast<const float *>(x), static_cast<std::size_t>(n), sum);
  return {sum[0], sum[1]};
}

/// The dot product with taps that lie at `fraction` between h0 and h1.
template <class Real, class T>
T dot_between(const Real *h0, const Real *h1, Real fraction, const T *x, std::int64_t n) noexcept {
  return (1 - fraction) * dot(h0, x, n) + fraction * dot(h1, x, n);
}
inline float dot_between(const float *h0, const float *h1, float fraction, const float *x, std::int64_t n) noexcept {
  return qsrfhs::kernels::active().dot_between(h0, h1, fraction, x, static_cast<std::size_t>(n));
}
inline std::complex<float> dot_between(const float *h0, const float *h1, float fraction, const std::complex<float> *x,
                                       std::int64_t n) noexcept {
  float sum[2];
  qsrfhs::kernels::active().complex_dot_between(h0, h1, fraction, reinterpret_cast<const float *>(x),
                                                static_cast<std::size_t>(n), sum);
  return {sum[0], sum[1]};
}

// Taps at t, t + step, ... between the coefficients, made in double precision.

template <class Real>
Real tap_between(const Real *h, double t) noexcept {
  const auto i = static_cast<std::int32_t>(t);
  const auto near = static_cast<double>(h[i]), far = static_cast<double>(h[i + 1]);
  return static_cast<Real>(near + (t - i) * (far - near));
}

/// Taps begin .. end - 1 of those that start at `tap`.
template <class Real>
void taps_between(const Real *h, double tap, double step, std::int64_t begin, std::int64_t end, Real *taps) noexcept {
  for (std::int64_t k = begin; k < end; ++k) *taps++ = tap_between(h, tap + static_cast<double>(k) * step);
}
inline void taps_between(const float *h, double tap, double step, std::int64_t begin, std::int64_t end,
                         float *taps) noexcept {
  const __m128d start = _mm_set1_pd(tap), steps = _mm_set1_pd(step), two = _mm_set1_pd(2);
  __m128d count = _mm_setr_pd(static_cast<double>(begin), static_cast<double>(begin + 1));
  std::int64_t k = begin;
  for (; k + 2 <= end; k += 2, taps += 2, count = _mm_add_pd(count, two)) {
    const __m128d t = _mm_add_pd(start, _mm_mul_pd(count, steps));
    const __m128i index = _mm_cvttpd_epi32(t);
    const std::int64_t both = _mm_cvtsi128_si64(index);
    const auto pair_at = [h](std::int64_t i) {
      return _mm_castpd_ps(_mm_load_sd(reinterpret_cast<const double *>(h + i)));
    };
    const __m128 pairs = _mm_unpacklo_ps(pair_at(static_cast<std::int32_t>(both)), pair_at(both >> 32));
    const __m128d near = _mm_cvtps_pd(pairs), far = _mm_cvtps_pd(_mm_movehl_ps(pairs, pairs));
    const __m128d fraction = _mm_sub_pd(t, _mm_cvtepi32_pd(index));
    const __m128 made = _mm_cvtpd_ps(_mm_add_pd(near, _mm_mul_pd(fraction, _mm_sub_pd(far, near))));
    _mm_storel_pi(reinterpret_cast<__m64 *>(taps), made);
  }
  if (k < end) *taps = tap_between(h, tap + static_cast<double>(k) * step);
}

/// The samples of one channel around a block: index -1 is the newest of the history.
template <class T>
struct channel {
  const T *block, *history_end;
  std::int64_t block_size;

  /// Samples first .. first + count - 1, in `copy` unless they can be read in groups where they are.
  const T *samples(std::int64_t first, std::int64_t count, T *copy) const noexcept {
    if (first >= 0 && first + in_groups(count) <= block_size) return block + first;
    const std::int64_t old = std::clamp<std::int64_t>(-first, 0, count);
    if (old > 0) std::copy_n(history_end + first, old, copy);
    if (old < count) std::copy_n(block + first + old, count - old, copy + old);
    return copy;
  }
};

/// The prototype phase by phase, so that the taps of one output lie side by side where the step is whole: row q holds
/// coefficients q, q + phases, q + 2 phases, ..., rows 0 .. phases.
template <class Real>
class phase_rows {
 public:
  [[nodiscard]] bool ready() const noexcept { return length_ > 0; }
  [[nodiscard]] const Real *row(std::int64_t phase) const noexcept { return &rows_[phase * length_]; }

  /// Without effect where they do not fit.
  void fill(std::span<const Real> h, std::int64_t phases) noexcept {
    const auto size = static_cast<std::int64_t>(h.size()), length = in_groups((size - 1) / phases + 1);
    if (length > capacity / (phases + 1)) return;
    length_ = length;
    for (std::int64_t q = 0; q <= phases; ++q) {
      Real *out = &rows_[q * length];
      Real *const end = out + length;
      for (std::int64_t i = q; i < size; i += phases) *out++ = h[static_cast<std::size_t>(i)];
      std::fill(out, end, Real{});
    }
  }

 private:
  static constexpr std::int64_t capacity = 32768 / sizeof(Real);
  std::int64_t length_ = 0;
  Real rows_[capacity];
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

  resampler(const prototype<real> &filter, std::int32_t interpolation, std::int64_t most_taps) noexcept
      : filter_(filter),
        reach_(position::of(filter.reach())),
        step_(filter.step()),
        last_(static_cast<double>(filter.h.size() - 1)),
        nearest_(interpolation == 1),
        whole_step_(filter.stretch == 1 ? static_cast<std::int64_t>(filter.phases) : 0),
        most_taps_(most_taps) {}

  /// Worth its time where `outputs` are at least as many as the phases.
  void prepare(std::int64_t outputs) noexcept {
    if (whole_step_ > 0 && outputs >= whole_step_) rows_.fill(filter_.h, whole_step_);
  }

  [[nodiscard]] position reach() const noexcept { return reach_; }

  /// The samples of an output at p, which are counted from where p is.
  [[nodiscard]] window around(position p) const noexcept {
    const position f{static_cast<wide_integer>(p.fraction_units())};
    const std::int64_t left = (reach_ - f).whole() + 1, right = (reach_ + f).whole();
    const double tap = filter_.centre() - step_ * p.fraction() - static_cast<double>(left - 1) * step_;
    return {p.whole() - left + 1, left + right, std::max(tap, 0.0)};
  }

  /// The output of every channel at a window whose first sample is `first` in the channels' own count. The result
  /// depends on the samples alone, not on where they are.
  template <class Channels>
  void compute(const window &w, std::int64_t first, std::int32_t rows, Channels channel_of, value *out,
               std::int64_t stride) {
    require(w.count <= most_taps_, history_too_short);
    if (w.count <= 0) {
      for (std::int32_t r = 0; r < rows; ++r) out[r * stride] = value{};
    }
    // With a whole step all taps lie equally far behind a coefficient: the sums over the coefficients in front of the
    // taps and over those behind them are enough, and no tap has to be made.
    const double t = nearest_ ? w.tap + 0.5 : w.tap;
    const auto index = static_cast<std::int64_t>(t);
    const auto fraction = static_cast<real>(t - static_cast<double>(index));
    const std::int64_t ahead = nearest_ ? 0 : 1;
    const bool in_step =
        whole_step_ > 0 && index + (w.count - 1) * whole_step_ + ahead < static_cast<std::int64_t>(filter_.h.size());
    const bool in_rows = in_step && rows_.ready() && index + ahead <= whole_step_;
    for (std::int64_t k = 0; k < w.count; k += piece) {
      const std::int64_t n = std::min(piece, w.count - k);
      const real *h0 = near_, *h1 = far_;
      if (in_rows) {
        h0 = rows_.row(index) + k;
        h1 = rows_.row(index + ahead) + k;
      } else if (in_step) {
        gather(index + k * whole_step_, n, near_);
        if (!nearest_) gather(index + 1 + k * whole_step_, n, far_);
      } else {
        make_taps(w, k, n);
      }
      for (std::int32_t r = 0; r < rows; ++r) {
        const value *const x = channel_of(r).samples(first + k, n, samples_);
        const value sum = in_step && !nearest_ ? dot_between(h0, h1, fraction, x, n) : dot(h0, x, n);
        value &y = out[r * stride];
        y = k == 0 ? sum : y + sum;
      }
    }
  }

 private:
  static constexpr std::int64_t piece = 256;  // taps at once, whole groups

  void gather(std::int64_t index, std::int64_t n, real *taps) const noexcept {
    for (std::int64_t j = 0; j < n; ++j, index += whole_step_) taps[j] = filter_.h[static_cast<std::size_t>(index)];
  }

  /// Taps k .. k + n - 1 of a window.
  void make_taps(const window &w, std::int64_t k, std::int64_t n) noexcept {
    const real *const h = filter_.h.data();
    if (nearest_) {
      const double t = w.tap + 0.5;
      for (std::int64_t j = 0; j < n; ++j)
        near_[j] = h[static_cast<std::int32_t>(std::min(t + static_cast<double>(k + j) * step_, last_))];
      return;
    }
    std::int64_t inside = n;  // the rest lies at the last coefficient, or beyond it by rounding
    while (inside > 0 && w.tap + static_cast<double>(k + inside - 1) * step_ >= last_) --inside;
    taps_between(h, w.tap, step_, k, k + inside, near_);
    std::fill(near_ + inside, near_ + n, filter_.h.back());
  }

  prototype<real> filter_;
  position reach_;
  double step_, last_;
  bool nearest_;
  std::int64_t whole_step_;  // 0: the step is not whole
  std::int64_t most_taps_;
  real near_[piece] = {}, far_[piece] = {};
  value samples_[piece] = {};
  phase_rows<real> rows_;
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
  const auto most_taps = static_cast<std::int64_t>(tap_history.values().size());
  resampler<E> engine(filter, state.interpolation, most_taps);
  const position ratio = position::of(state.ratio);
  const std::int64_t available = std::int64_t{state.carried} + n;
  // No sample in front of the history may be asked for.
  const window nearest = engine.around(p);
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
  engine.prepare(count * rows);
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
