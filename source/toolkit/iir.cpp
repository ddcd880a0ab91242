// Recursive filters in direct form. SPDX-License-Identifier: MIT
#include <lumra/toolkit.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <span>
#include <type_traits>
#include <utility>

#include "toolkit/arithmetic.hpp"
#include "toolkit/frame.hpp"
#include "toolkit/recursion.hpp"

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
  refuse_sharing(forward_state, record, reverse_state, a, b);
  refuse_sharing(reverse_state, record, a, b);
  const bool one_room = &room.forward == &room.reverse;
  refuse_sharing(room.forward, record, a, b, forward_state, reverse_state, saved_inputs);
  if (!one_room) refuse_sharing(room.reverse, record, a, b, forward_state, reverse_state, saved_inputs, room.forward);
  refuse_sharing(saved_inputs, record, a, b, forward_state, reverse_state);

  const auto differs = [](const output<E> &state, std::int32_t count) {
    return !state.which().has_block() || static_cast<std::int32_t>(state.values().size()) != count;
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
