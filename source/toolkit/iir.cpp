// Recursive filters in direct form. SPDX-License-Identifier: MIT
#include <lumra/toolkit.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <optional>
#include <span>
#include <type_traits>
#include <utility>

#include "toolkit/arithmetic.hpp"
#include "toolkit/frame.hpp"
#include "toolkit/lanes.hpp"
#include "toolkit/recursion.hpp"

namespace toolkit {
namespace {

// Complex samples are two real streams side by side, since the coefficients are real: sample i of stream `part` lies at
// i * parts + part.

/// x[i] becomes the sum over j of b[j] x[i - j], terms in the order of j whatever i is. From the end on, because a
/// result must not be written while a later one needs its sample. `before` holds earlier samples, newest first.
template <int parts, class Real>
void convolve_in_place(Real *x, std::int64_t n, std::span<const Real> b, const Real *before) noexcept {
  constexpr std::int64_t group = 32 / sizeof(Real), most = 64 * group;  // whole groups read no sample behind them
  const auto nb = static_cast<std::int64_t>(b.size());
  const std::int64_t first = std::min((nb - 1) * parts, n * parts);  // values from here on need no earlier samples
  std::int64_t i = n * parts;
  while (i - first >= group) {
    std::array<Real, most> sums;
    const std::int64_t count = std::min(i - first, most) / group * group;
    i -= count;
    convolve(x + i, b, parts, std::span(sums).first(static_cast<std::size_t>(count)));
    std::copy_n(sums.begin(), count, x + i);
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
      std::array<Real, 4> sum{};
      std::int64_t j = 2;
      if (i >= order) {
        const Real *past = data + i * parts + part;
        for (; j + 3 <= order; j += 4)
          for (std::int64_t l = 0; l < 4; ++l)
            sum[static_cast<std::size_t>(l)] += a[static_cast<std::size_t>(j + l)] * past[-(j + l) * parts];
      } else {
        for (; j + 3 <= order; j += 4)
          for (std::int64_t l = 0; l < 4; ++l)
            sum[static_cast<std::size_t>(l)] += a[static_cast<std::size_t>(j + l)] * y(j + l);
      }
      for (std::size_t l = 0; j <= order; ++j, ++l) sum[l] += a[static_cast<std::size_t>(j)] * y(j);
      Real &w = data[i * parts + part];
      w = gain * ((w - folded(sum)) - a[1] * y(1));
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

/// What the states hold when a call begins.
enum class history { kept, silence };

history history_by(std::int32_t reset) noexcept {
  return reset != 0 ? history::silence : history::kept;
}

/// The data, which become the result, and the newest samples in front of both sums, newest first.
template <class E>
struct filter_arrays {
  output<E> data, forward_state, reverse_state;

  void clear() noexcept {
    data.clear();
    forward_state.clear();
    reverse_state.clear();
  }
};

/// The denominator a, which may be empty, and the numerator b.
template <class F>
struct filter_coefficients {
  input<F> a, b;
};

/// Workspace: coefficients of both kinds, in two arrays or (without `reverse`) in one, and the data's newest samples.
template <class E, class F>
struct filter_workspace {
  scratch<F> forward;
  std::optional<scratch<F>> reverse;
  scratch<E> saved_inputs;
};

template <class E, class F>
void refuse_sharing_of_any(const filter_arrays<E> &arrays, const filter_coefficients<F> &of,
                           const filter_workspace<E, F> &room) {
  const auto &[data, forward_state, reverse_state] = arrays;
  refuse_sharing(forward_state, data, reverse_state, of.a, of.b);
  refuse_sharing(reverse_state, data, of.a, of.b);
  refuse_sharing(room.forward, data, of.a, of.b, forward_state, reverse_state, room.saved_inputs);
  if (room.reverse)
    refuse_sharing(*room.reverse, data, of.a, of.b, forward_state, reverse_state, room.saved_inputs, room.forward);
  refuse_sharing(room.saved_inputs, data, of.a, of.b, forward_state, reverse_state);
}

/// Gives the states the sizes that the filter's orders ask for; where one had another size both begin with silence.
template <class E>
void size_states(filter_arrays<E> &arrays, std::int32_t na, std::int32_t nb, history before) {
  auto &[data, forward_state, reverse_state] = arrays;
  const auto differs = [](const output<E> &state, std::int32_t count) {
    return !state.which().has_block() || static_cast<std::int32_t>(state.values().size()) != count;
  };
  const bool fresh =
      before == history::silence || differs(forward_state, nb - 1) || (na >= 1 && differs(reverse_state, na - 1));
  forward_state.resize(nb - 1);
  if (na >= 1) reverse_state.resize(na - 1);
  if (!fresh) return;
  for (const auto &state : {forward_state.values(), reverse_state.values()})
    std::fill(state.begin(), state.end(), value_of<E>{});
}

/// Copies of the coefficients: the data, which may be the same array, change meanwhile. A single coefficient takes no
/// workspace.
template <class E, class F>
class copied_coefficients {
 public:
  using real = real_of<F>;

  copied_coefficients(const filter_coefficients<F> &of, filter_workspace<E, F> &room)
      : first_a_(of.a.count() >= 1 ? of.a.values()[0] : real{1}), first_b_(of.b.values()[0]) {
    // Whole groups of four, for the denominator behind a[0].
    const std::int64_t na = of.a.count(), nb = of.b.count();
    const std::int64_t of_b = nb > 1 ? (nb + 3) / 4 * 4 : 0, of_a = na > 1 ? 4 * ((na + 2) / 4) + 1 : 0;
    std::span<real> memory_b, memory_a;
    if (room.reverse) {
      if (of_b > 0) memory_b = room.forward.resize(of_b);
      if (of_a > 0) memory_a = room.reverse->resize(of_a);
    } else if (of_b + of_a > 0) {
      memory_b = room.forward.resize(of_b + of_a);
      memory_a = memory_b.subspan(static_cast<std::size_t>(of_b));
    }
    if (of_b > 0) b_ = copy_into(memory_b, of.b.values());
    if (of_a > 0) a_ = copy_into(memory_a, of.a.values());
  }

  /// Empty where there is one coefficient, or none.
  [[nodiscard]] std::span<const real> a() const noexcept { return a_; }
  [[nodiscard]] std::span<const real> b() const noexcept { return b_; }
  /// 1 where there is none.
  [[nodiscard]] real first_a() const noexcept { return first_a_; }
  [[nodiscard]] real first_b() const noexcept { return first_b_; }

 private:
  static std::span<const real> copy_into(std::span<real> memory, std::span<const real> from) noexcept {
    std::copy(from.begin(), from.end(), memory.begin());
    return memory.first(from.size());
  }

  std::span<const real> a_, b_;
  real first_a_, first_b_;
};

/// The values of samples, one by one.
template <class E>
std::span<real_of<E>> reals(std::span<value_of<E>> samples) noexcept {
  constexpr std::size_t parts = is_complex<E> ? 2 : 1;
  return {reinterpret_cast<real_of<E> *>(samples.data()), samples.size() * parts};
}

/// E: letter of the data, F: of the coefficients.
template <class E, class F>
void filter(filter_arrays<E> &arrays, const filter_coefficients<F> &given, history before,
            filter_workspace<E, F> room) {
  constexpr int parts = is_complex<E> ? 2 : 1;
  const std::span<value_of<E>> data = arrays.data.values();
  const auto n = static_cast<std::int32_t>(data.size());
  const std::int32_t na = given.a.count(), nb = given.b.count();
  if (n < 1 || (nb < 1 && na < 1)) return;
  require(nb >= 1, empty_result);
  refuse_sharing_of_any(arrays, given, room);
  size_states(arrays, na, nb, before);
  const copied_coefficients<E, F> coefficients(given, room);

  if (nb == 1) {
    scale(n, coefficients.first_b(), data.data());
  } else {
    const auto state = arrays.forward_state.values();
    const auto newest = data.last(static_cast<std::size_t>(std::min(nb - 1, n)));
    const auto saved = room.saved_inputs.resize(static_cast<std::int64_t>(newest.size()));
    std::copy(newest.begin(), newest.end(), saved.begin());
    convolve_in_place<parts>(reals<E>(data).data(), n, coefficients.b(), reals<E>(state).data());
    push_front<value_of<E>>(state, saved);
  }
  if (na == 1) {
    scale(n, 1 / coefficients.first_a(), data.data());
  } else if (na > 1) {
    const auto state = arrays.reverse_state.values();
    recurse<parts, real_of<E>>(reals<E>(data), coefficients.a(), reals<E>(state));
    push_front<value_of<E>>(state, data);
  }
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define IIR(NAME, E, F)                                                                                                \
  int32_t qsRFPELTA_##NAME##IIRDirectFilterH(                                                                          \
      handle<E> data, handle<F> reverse, handle<F> forward, handle<E> forwardState, handle<E> reverseState,            \
      int32_t reset, handle<F> forwardScratch, handle<F> reverseScratch, handle<E> inputScratch) {                     \
    return toolkit_call(                                                                                               \
        [&](filter_arrays<E> &arrays) {                                                                                \
          filter<E, F>(arrays, {reverse, forward}, history_by(reset), {forwardScratch, reverseScratch, inputScratch}); \
        },                                                                                                             \
        filter_arrays<E>{output<E>(data), output<E>(forwardState), output<E>(reverseState)});                          \
  }
IIR(ss, s, s)
IIR(dd, d, d)
IIR(cs, c, s)
#undef IIR

int32_t qsRFPELTA_zdIIRDirectFilterH(handle<z> data, handle<d> reverse, handle<d> forward, handle<z> forwardState,
                                     handle<z> reverseState, int32_t reset, handle<d> coefficientScratch,
                                     handle<z> inputScratch) {
  return toolkit_call(
      [&](filter_arrays<z> &arrays) {
        filter<z, d>(arrays, {reverse, forward}, history_by(reset), {coefficientScratch, std::nullopt, inputScratch});
      },
      filter_arrays<z>{output<z>(data), output<z>(forwardState), output<z>(reverseState)});
}
