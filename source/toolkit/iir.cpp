// Recursive filters in direct form. SPDX-License-Identifier: MIT
#include <lumra/toolkit.h>

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <limits>
#include <span>
#include <type_traits>
#include <utility>

#include "toolkit/arithmetic.hpp"
#include "toolkit/frame.hpp"

namespace toolkit {
namespace {

// Complex samples are two real streams side by side, since the coefficients are real: sample i of stream `part` lies at
// i * parts + part.

/// x[i] becomes the sum over j of b[j] x[i - j], terms in the order of j whatever i is. From the end on, because a
/// result must not be written while a later one needs its sample. `before` holds earlier samples, newest first.
template <int parts, class Real>
void convolve_in_place(Real *x, std::int64_t n, std::span<const Real> b, const Real *before) noexcept {
  // Results side by side in four registers of 16 bytes; a plain loop over them ends up vectorised over j.
  using lane [[gnu::vector_size(16)]] = Real;
  constexpr std::int64_t width = sizeof(lane) / sizeof(Real), lanes = 4 * width;
  const auto load = [](const Real *from) {
    lane v;
    std::memcpy(&v, from, sizeof v);
    return v;
  };
  const auto nb = static_cast<std::int64_t>(b.size());
  const std::int64_t first = std::min((nb - 1) * parts, n * parts);  // values from here on need no earlier samples
  std::int64_t i = n * parts;
  for (; i - lanes >= first; i -= lanes) {
    Real *const y = x + i - lanes;
    lane sum[4];
    for (int l = 0; l < 4; ++l) sum[l] = b[0] * load(y + l * width);
    for (std::int64_t j = 1; j < nb; ++j) {
      const Real coefficient = b[static_cast<std::size_t>(j)];
      const Real *const past = y - j * parts;
      for (int l = 0; l < 4; ++l) sum[l] += coefficient * load(past + l * width);
    }
    std::memcpy(y, sum, sizeof sum);
  }
  while (--i >= 0) {
    Real sum = b[0] * x[i];
    for (std::int64_t j = 1; j < nb; ++j) {
      const std::int64_t k = i - j * parts;
      // k < 0: sample -1 is before[0], and so on.
      const Real sample = k >= 0 ? x[k] : before[((-k + parts - 1) / parts - 1) * parts + i % parts];
      sum += b[static_cast<std::size_t>(j)] * sample;
    }
    x[i] = sum;
  }
}

/// Outputs below the normal range, which multiplications would take a hundred times longer for, as whole multiples of
/// the smallest number; double precision holds them and their products without coming near its own limits.
template <class Real>
struct subnormal {
  using bits = std::conditional_t<sizeof(Real) == 4, std::uint32_t, std::uint64_t>;
  using integer = std::make_signed_t<bits>;

  static constexpr bits sign = bits{1} << (8 * sizeof(bits) - 1);
  static constexpr int exponent = sizeof(Real) == 4 ? -149 : -1074;
  /// Numbers below this many steps are treated so. They leave room in the sum with `rounder`.
  static constexpr bits limit = bits{1} << (sizeof(Real) == 4 ? 23 : 51);
  /// Adding this to a smaller number rounds it to a whole one.
  static constexpr double rounder = 6755399441055744.0;  // 1.5 * 2^52

  static bool is(Real v) noexcept { return (std::bit_cast<bits>(v) & ~sign) < limit; }
  static double steps(Real v) noexcept {
    const auto raw = std::bit_cast<bits>(v);
    const auto mask = -static_cast<integer>(raw >> (8 * sizeof(bits) - 1));  // all ones below 0
    return static_cast<double>((static_cast<integer>(raw & ~sign) ^ mask) - mask);
  }
  static Real value(double steps) noexcept {
    const auto whole = static_cast<integer>(steps);
    const auto mask = whole >> (8 * sizeof(bits) - 1);
    return std::bit_cast<Real>(static_cast<bits>((whole ^ mask) - mask) | (static_cast<bits>(mask) & sign));
  }
};

/// The recursion of one order: y = g (w - sum over j = 1 .. order of a[j] y[-j]), y[-1] last because it comes last.
template <int parts, int order, class Real>
class recursion {
 public:
  using small = subnormal<Real>;

  recursion(const Real *reverse, Real gain) noexcept : gain_(gain) {
    std::copy_n(reverse + 1, order, a_.begin());
    for (int j = 0; j < order; ++j) scaled_[at(j)] = static_cast<double>(gain) * static_cast<double>(a_[at(j)]);
  }

  /// Newest outputs first.
  void load(const Real *state) noexcept {
    for (int part = 0; part < parts; ++part) {
      for (int j = 0; j < order; ++j) y_[at(part)][at(j)] = state[j * parts + part];
      quiet_[at(part)] = 0;
      while (quiet_[at(part)] < order && small::is(y_[at(part)][at(quiet_[at(part)])])) ++quiet_[at(part)];
      if (quiet_[at(part)] == order) enter(at(part));
    }
  }

  void run(Real *data, std::int64_t n) noexcept {
    Real *const end = data + n * parts;
    while (data < end)
      data = any_quiet() ? run_quiet(data, end) : gain_ == 1 ? run_loud<true>(data, end) : run_loud<false>(data, end);
  }

 private:
  static constexpr std::size_t at(int j) noexcept { return static_cast<std::size_t>(j); }

  template <bool unit_gain>
  [[nodiscard]] Real next(Real w, const std::array<Real, order> &y) const noexcept {
    for (int j = order - 1; j >= 0; --j) w -= a_[at(j)] * y[at(j)];
    return unit_gain ? w : gain_ * w;
  }
  template <class T>
  static void shift(std::array<T, order> &y, T newest) noexcept {
    for (int j = order - 1; j > 0; --j) y[at(j)] = y[at(j - 1)];
    y[0] = newest;
  }

  [[nodiscard]] bool any_quiet() const noexcept {
    return std::any_of(quiet_.begin(), quiet_.end(), [](int quiet) { return quiet == order; });
  }

  /// Until `order` outputs in succession were subnormal, in one part.
  template <bool unit_gain>
  Real *run_loud(Real *data, Real *end) noexcept {
    auto y = y_;  // in registers
    auto quiet = quiet_;
    bool loud = true;
    while (data < end && loud) {
      for (std::size_t part = 0; part < parts; ++part) {
        const Real newest = next<unit_gain>(*data, y[part]);
        shift(y[part], newest);
        *data++ = newest;
        quiet[part] = small::is(newest) ? quiet[part] + 1 : 0;
        loud = loud && quiet[part] < order;
      }
    }
    y_ = y;
    quiet_ = quiet;
    for (std::size_t part = 0; part < parts; ++part)
      if (quiet_[part] == order) enter(part);
    return data;
  }

  /// Until no part has had `order` subnormal outputs in succession.
  Real *run_quiet(Real *data, Real *end) noexcept {
    while (data < end && any_quiet()) {
      if (std::all_of(quiet_.begin(), quiet_.end(), [](int quiet) { return quiet == order; })) {
        data = run_all_quiet(data, end);
        if (data == end) break;
      }
      for (std::size_t part = 0; part < parts; ++part, ++data) {
        if (quiet_[part] == order && small::is(*data)) {
          *data = next_quiet(*data, part);
          continue;
        }
        const Real newest = gain_ == 1 ? next<true>(*data, y_[part]) : next<false>(*data, y_[part]);
        shift(y_[part], newest);
        *data = newest;
        quiet_[part] = small::is(newest) ? std::min(quiet_[part] + 1, order) : 0;
        if (quiet_[part] == order) enter(part);
      }
    }
    return data;
  }

  /// Up to the first sample that makes one of the parts louder, which is left to do.
  Real *run_all_quiet(Real *data, Real *end) noexcept {
    auto v = steps_;  // in registers
    for (; data < end; data += parts) {
      std::array<double, parts> newest;
      bool quiet = true;
      for (std::size_t part = 0; part < parts; ++part) {
        newest[part] = whole_steps(rest(data[part], v[part]), v[part]);
        quiet = quiet && small::is(data[part]) && std::abs(newest[part]) < static_cast<double>(small::limit);
      }
      if (!quiet) break;
      for (std::size_t part = 0; part < parts; ++part) {
        shift(v[part], newest[part]);
        data[part] = small::value(newest[part]);
      }
    }
    steps_ = v;
    for (std::size_t part = 0; part < parts; ++part)
      for (int j = 0; j < order; ++j) y_[part][at(j)] = small::value(v[part][at(j)]);
    return data;
  }

  void enter(std::size_t part) noexcept {
    for (int j = 0; j < order; ++j) steps_[part][at(j)] = small::steps(y_[part][at(j)]);
  }

  /// All of the sum but the newest output's part.
  [[nodiscard]] double rest(Real w, const std::array<double, order> &v) const noexcept {
    double sum = static_cast<double>(gain_) * small::steps(w);
    for (int j = order - 1; j > 0; --j) sum -= scaled_[at(j)] * v[at(j)];
    return sum;
  }
  [[nodiscard]] double whole_steps(double rest, const std::array<double, order> &v) const noexcept {
    return ((rest + small::rounder) - scaled_[0] * v[0]) - small::rounder;
  }

  Real next_quiet(Real w, std::size_t part) noexcept {
    auto &v = steps_[part];
    const double sum = rest(w, v), whole = whole_steps(sum, v);
    Real newest;
    if (std::abs(whole) < static_cast<double>(small::limit)) {
      shift(v, whole);
      newest = small::value(whole);
    } else {  // louder again, or not a number
      newest = static_cast<Real>(std::ldexp(sum - scaled_[0] * v[0], small::exponent));
      quiet_[part] = 0;
    }
    shift(y_[part], newest);
    return newest;
  }

  std::array<Real, order> a_;
  std::array<double, order> scaled_;
  Real gain_;
  std::array<std::array<Real, order>, parts> y_{};
  std::array<std::array<double, order>, parts> steps_{};
  std::array<int, parts> quiet_{};
};

/// Highest order with a recursion of its own; all others share recurse_any.
constexpr int unrolled_orders = 12;

/// Four sums side by side; state in the order of `recursion`.
template <int parts, class Real>
void recurse_any(Real *data, std::int64_t n, std::span<const Real> a, Real gain, const Real *state) noexcept {
  const auto order = static_cast<std::int64_t>(a.size()) - 1;
  for (std::int64_t i = 0; i < n; ++i) {
    for (std::int64_t part = 0; part < parts; ++part) {
      const auto y = [&](std::int64_t j) {
        return j <= i ? data[(i - j) * parts + part] : state[(j - i - 1) * parts + part];
      };
      Real sum[4] = {};
      std::int64_t j = 2;
      if (i >= order) {
        const Real *past = data + i * parts + part;
        for (; j + 3 <= order; j += 4)
          for (std::int64_t l = 0; l < 4; ++l) sum[l] += a[static_cast<std::size_t>(j + l)] * past[-(j + l) * parts];
      } else {
        for (; j + 3 <= order; j += 4)
          for (std::int64_t l = 0; l < 4; ++l) sum[l] += a[static_cast<std::size_t>(j + l)] * y(j + l);
      }
      for (std::int64_t l = 0; j <= order; ++j, ++l) sum[l] += a[static_cast<std::size_t>(j)] * y(j);
      Real &w = data[i * parts + part];
      w = gain * ((w - ((sum[0] + sum[2]) + (sum[1] + sum[3]))) - a[1] * y(1));
    }
  }
}

/// `state` holds the newest of a stream's samples, newest first: puts the newest of `data` in front.
template <class T>
void push_front(std::span<T> state, std::span<const T> data) noexcept {
  const std::size_t fresh = std::min(state.size(), data.size());
  std::copy_backward(state.begin(), state.end() - static_cast<std::ptrdiff_t>(fresh), state.end());
  std::reverse_copy(data.end() - static_cast<std::ptrdiff_t>(fresh), data.end(), state.begin());
}

template <int parts, class Real>
void recurse(std::span<Real> data, std::span<const Real> a, std::span<const Real> state) noexcept {
  const auto n = static_cast<std::int64_t>(data.size()) / parts;
  const Real gain = 1 / a[0];
  const auto order = static_cast<int>(a.size()) - 1;
  const auto unrolled = [&]<int... orders>(std::integer_sequence<int, orders...>) {
    return ((orders + 1 == order && (
                 [&] {
                   recursion<parts, orders + 1, Real> filter(a.data(), gain);
                   filter.load(state.data());
                   filter.run(data.data(), n);
                 }(),
                 true)) ||
            ...);
  };
  if (unrolled(std::make_integer_sequence<int, unrolled_orders>())) return;
  recurse_any<parts>(data.data(), n, a, gain, state.data());
}

/// A copy of coefficients in workspace that has `size` elements, zeros behind them.
template <class Real>
std::span<const Real> copy_into(std::span<Real> room, std::span<const Real> from) {
  std::fill(std::copy(from.begin(), from.end(), room.begin()), room.end(), Real{});
  return room.first(from.size());
}

template <class E>
struct filter_arrays {
  output<E> data, forward_state, reverse_state;
};

/// Workspace for both sets of coefficients: two arrays, or one for all.
template <class F>
struct coefficient_room {
  scratch<F> &forward, &reverse;
};

/// E: letter of the data, F: of the coefficients.
template <class E, class F>
void filter(filter_arrays<E> &arrays, input<F> a, input<F> b, bool reset, const coefficient_room<F> &room,
            scratch<E> &saved_inputs) {
  using real = real_of<E>;
  constexpr int parts = is_complex<E> ? 2 : 1;
  auto &[record, forward_state, reverse_state] = arrays;
  const std::int32_t n = static_cast<std::int32_t>(record.values().size()), na = a.count(), nb = b.count();
  if (n < 1 || (nb < 1 && na < 1)) return;
  require(nb >= 1, empty_result);
  const auto apart = [](const auto &state, const auto &...others) {
    require(!state.block() || ((others.block() != state.block()) && ...), bad_option);
  };
  apart(forward_state, record, reverse_state, a, b);
  apart(reverse_state, record, a, b);
  const bool one_room = &room.forward == &room.reverse;
  room.forward.keep_apart_from(record, a, b, forward_state, reverse_state, saved_inputs);
  if (!one_room) room.reverse.keep_apart_from(record, a, b, forward_state, reverse_state, saved_inputs, room.forward);
  saved_inputs.keep_apart_from(record, a, b, forward_state, reverse_state);

  const auto differs = [](const output<E> &state, std::int32_t count) {
    return !state.block() || static_cast<std::int32_t>(state.values().size()) != count;
  };
  const bool fresh = reset || differs(forward_state, nb - 1) || (na >= 1 && differs(reverse_state, na - 1));
  forward_state.resize(nb - 1);
  if (na >= 1) reverse_state.resize(na - 1);
  if (fresh) {
    for (const auto &state : {forward_state.values(), reverse_state.values()})
      std::fill(state.begin(), state.end(), value_of<E>{});
  }

  // Coefficients are copied before the data change, which may be the same array. Whole groups of four, and a[0].
  const std::int64_t forward_size = nb > 1 ? (std::int64_t{nb} + 3) / 4 * 4 : 0;
  const std::int64_t reverse_size = na > 1 ? 4 * ((std::int64_t{na} + 2) / 4) + 1 : 0;
  std::span<real> forward_room, reverse_room;
  if (one_room) {
    if (forward_size + reverse_size > 0) forward_room = room.forward.resize(forward_size + reverse_size);
    reverse_room = forward_room.subspan(static_cast<std::size_t>(forward_size));
    forward_room = forward_room.first(static_cast<std::size_t>(forward_size));
  } else {
    if (forward_size > 0) forward_room = room.forward.resize(forward_size);
    if (reverse_size > 0) reverse_room = room.reverse.resize(reverse_size);
  }
  const real only_forward = b.values()[0], only_reverse = na >= 1 ? a.values()[0] : real{1};
  if (nb > 1) copy_into(forward_room, b.values());
  if (na > 1) copy_into(reverse_room, a.values());

  const auto data = record.values();
  const auto reals = [](std::span<value_of<E>> v) {
    return std::span<real>(reinterpret_cast<real *>(v.data()), v.size() * parts);
  };
  if (nb == 1) {
    scale(n, only_forward, data.data());
  } else {
    const auto saved = saved_inputs.resize(std::min(nb - 1, n));
    std::copy(data.end() - static_cast<std::ptrdiff_t>(saved.size()), data.end(), saved.begin());
    const auto state = forward_state.values();
    convolve_in_place<parts, real>(reals(data).data(), n, forward_room.first(static_cast<std::size_t>(nb)),
                                   reals(state).data());
    push_front<value_of<E>>(state, saved);
  }
  if (na == 1) {
    scale(n, 1 / only_reverse, data.data());
  } else if (na > 1) {
    const auto state = reverse_state.values();
    recurse<parts, real>(reals(data), reverse_room.first(static_cast<std::size_t>(na)), reals(state));
    push_front<value_of<E>>(state, data);
  }
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define IIR(NAME, E, F)                                                                                        \
  int32_t qsRFPELTA_##NAME##IIRDirectFilterH(                                                                  \
      handle<E> data, handle<F> reverse, handle<F> forward, handle<E> forwardState, handle<E> reverseState,    \
      int32_t reset, handle<F> forwardScratch, handle<F> reverseScratch, handle<E> inputScratch) {             \
    filter_arrays<E> arrays{output<E>(data), output<E>(forwardState), output<E>(reverseState)};                \
    scratch<F> forward_room(forwardScratch), reverse_room(reverseScratch);                                     \
    scratch<E> saved(inputScratch);                                                                            \
    const coefficient_room<F> room{forward_room, reverse_room};                                                \
    return toolkit_call([&] { filter<E, F>(arrays, reverse, forward, reset != 0, room, saved); }, arrays.data, \
                        arrays.forward_state, arrays.reverse_state);                                           \
  }
IIR(ss, s, s)
IIR(dd, d, d)
IIR(cs, c, s)
#undef IIR

int32_t qsRFPELTA_zdIIRDirectFilterH(handle<z> data, handle<d> reverse, handle<d> forward, handle<z> forwardState,
                                     handle<z> reverseState, int32_t reset, handle<d> coefficientScratch,
                                     handle<z> inputScratch) {
  filter_arrays<z> arrays{output<z>(data), output<z>(forwardState), output<z>(reverseState)};
  scratch<d> both(coefficientScratch);
  scratch<z> saved(inputScratch);
  const coefficient_room<d> room{both, both};
  return toolkit_call([&] { filter<z, d>(arrays, reverse, forward, reset != 0, room, saved); }, arrays.data,
                      arrays.forward_state, arrays.reverse_state);
}
