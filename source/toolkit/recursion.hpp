// The recursion of a filter in direct form, about as fast in silence as in sound. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <limits>
#include <type_traits>

namespace toolkit {

/// Values that run side by side: one, or the two parts of a complex one, with the doubles and the integers that stand
/// for them. The language's operators work on both. Masks are below 0 where they hold.
template <int parts, class Real>
struct sample;

template <class Real>
struct sample<1, Real> {
  using reals = Real;
  using doubles = double;
  using integers = std::conditional_t<sizeof(Real) == 4, std::int32_t, std::int64_t>;
  using long_integers = std::int64_t;

  template <class To, class From>
  static To convert(From v) noexcept {
    return static_cast<To>(v);
  }
  template <class Mask>
  static bool all(Mask mask) noexcept {
    return mask < 0;
  }
  template <class Mask>
  static bool any(Mask mask) noexcept {
    return mask < 0;
  }
  static bool any_bit(integers v) noexcept { return v != 0; }
  static Real &part(Real &v, std::size_t) noexcept { return v; }
};

template <class Real>
struct sample<2, Real> {
  using integer = typename sample<1, Real>::integers;
  using reals [[gnu::vector_size(2 * sizeof(Real))]] = Real;
  using doubles [[gnu::vector_size(2 * sizeof(double))]] = double;
  using integers [[gnu::vector_size(2 * sizeof(Real))]] = integer;
  using long_integers [[gnu::vector_size(2 * sizeof(double))]] = std::int64_t;

  template <class To, class From>
  static To convert(From v) noexcept {
    return __builtin_convertvector(v, To);
  }
  template <class Mask>
  static bool all(Mask mask) noexcept {
    return (mask[0] & mask[1]) < 0;
  }
  template <class Mask>
  static bool any(Mask mask) noexcept {
    return (mask[0] | mask[1]) < 0;
  }
  static bool any_bit(integers v) noexcept { return (v[0] | v[1]) != 0; }
  static Real &part(reals &v, std::size_t which) noexcept { return reinterpret_cast<Real *>(&v)[which]; }
};

/// Outputs below the normal range, which multiplications would take a hundred times longer for, as whole multiples of
/// the smallest number; double precision holds them and their products without coming near its own limits.
template <int parts, class Real>
struct subnormal {
  using lane = sample<parts, Real>;
  using reals = typename lane::reals;
  using doubles = typename lane::doubles;
  using integers = typename lane::integers;
  using long_integers = typename lane::long_integers;
  using integer = typename sample<1, Real>::integers;

  static constexpr integer magnitude = std::numeric_limits<integer>::max(), sign = std::numeric_limits<integer>::min();
  static constexpr int exponent = sizeof(Real) == 4 ? -149 : -1074;
  /// Numbers below this many steps are treated so. They leave room in the sum with `rounder`.
  static constexpr integer limit = integer{1} << (sizeof(Real) == 4 ? 23 : 51);
  /// Adding this to a smaller number rounds it to a whole one.
  static constexpr double rounder = 6755399441055744.0;  // 1.5 * 2^52

  static integers is(reals v) noexcept { return (std::bit_cast<integers>(v) & magnitude) - limit; }
  static auto are_few(doubles steps) noexcept {
    constexpr auto unsigned_part = std::numeric_limits<std::int64_t>::max();
    return (std::bit_cast<long_integers>(steps) & unsigned_part) - std::bit_cast<std::int64_t>(double{limit});
  }
  static doubles steps(reals v) noexcept {
    const auto raw = std::bit_cast<integers>(v);
    if constexpr (sizeof(Real) == 8) {
      const doubles shifted = std::bit_cast<doubles>((raw & magnitude) | std::bit_cast<integer>(first_whole));
      return std::bit_cast<doubles>(std::bit_cast<integers>(shifted - first_whole) | (raw & sign));
    } else {
      const integers negative = raw >> 31;  // all ones below 0
      return lane::template convert<doubles>(((raw & magnitude) ^ negative) - negative);
    }
  }
  static reals value(doubles steps) noexcept {
    if constexpr (sizeof(Real) == 8) {
      const auto raw = std::bit_cast<integers>(steps);
      const doubles shifted = std::bit_cast<doubles>(raw & magnitude) + first_whole;
      return std::bit_cast<reals>((std::bit_cast<integers>(shifted) & mantissa) | (raw & sign));
    } else {
      const auto whole = lane::template convert<integers>(steps);
      const integers negative = whole >> 31;
      return std::bit_cast<reals>(((whole ^ negative) - negative) | (negative & sign));
    }
  }

 private:
  /// Sums of this and smaller whole numbers hold those in their lowest bits.
  static constexpr double first_whole = 4503599627370496.0;  // 2^52
  static constexpr integer mantissa = static_cast<integer>((std::int64_t{1} << 52) - 1);
};

/// The recursion of one order: y = g (w - sum over j = 1 .. order of a[j] y[-j]), y[-1] last because it comes last.
/// A part whose last `order` outputs were subnormal is quiet.
template <int parts, int order, class Real>
class recursion {
 public:
  recursion(const Real *reverse, Real gain) noexcept : gain_(gain) {
    std::copy_n(reverse + 1, order, a_.begin());
    std::transform(a_.begin(), a_.end(), scaled_.begin(),
                   [gain](Real a) { return static_cast<double>(gain) * static_cast<double>(a); });
  }

  /// Newest outputs first.
  void load(const Real *state) noexcept {
    for (reals &y : y_) y = read(state), state += parts;
    for (std::size_t part = 0; part < parts; ++part) {
      const auto loud = [part](reals &y) { return !is_small(lane::part(y, part)); };
      quiet_[part] = static_cast<int>(std::find_if(y_.begin(), y_.end(), loud) - y_.begin());
    }
  }

  void run(Real *data, std::int64_t n) noexcept {
    Real *const end = data + n * parts;
    while (data < end) {
      const auto quiet = std::count(quiet_.begin(), quiet_.end(), order);
      if (quiet == 0) {
        data = gain_ == 1 ? run_loud<gain_kind::one>(data, end) : run_loud<gain_kind::any>(data, end);
      } else {
        if (quiet == parts) data = run_quiet(data, end);
        if (data < end) data = step_apart(data);
      }
    }
  }

 private:
  enum class gain_kind { one, any };  // a gain of 1 takes no multiplication

  using lane = sample<parts, Real>;
  using reals = typename lane::reals;
  using doubles = typename lane::doubles;
  using one = subnormal<1, Real>;
  using all = subnormal<parts, Real>;

  static bool is_small(Real v) noexcept { return one::is(v) < 0; }
  static reals read(const Real *from) noexcept {
    reals v;
    std::memcpy(&v, from, sizeof v);
    return v;
  }
  template <class T>
  static void shift(std::array<T, order> &y, T newest) noexcept {
    for (std::size_t j = order - 1; j > 0; --j) y[j] = y[j - 1];
    y[0] = newest;
  }
  template <gain_kind gain, class T>
  [[nodiscard]] T next(T w, const std::array<T, order> &y) const noexcept {
    for (std::size_t j = order; j-- > 0;) w -= a_[j] * y[j];
    return gain == gain_kind::one ? w : gain_ * w;
  }
  /// In steps of the smallest number: the output, not rounded, but for the newest output's share.
  template <class T>
  [[nodiscard]] T rest(T w, const std::array<T, order> &v) const noexcept {
    w *= static_cast<double>(gain_);
    for (std::size_t j = order - 1; j > 0; --j) w -= scaled_[j] * v[j];
    return w;
  }
  template <class T>
  [[nodiscard]] T whole(T rest, const std::array<T, order> &v) const noexcept {
    return ((rest + one::rounder) - scaled_[0] * v[0]) - one::rounder;
  }

  /// Until a part is quiet.
  template <gain_kind gain>
  Real *run_loud(Real *data, Real *end) noexcept {
    auto y = y_;  // in registers
    auto quiet = quiet_;
    for (bool loud = true; data < end && loud; data += parts) {
      const reals newest = next<gain>(read(data), y);
      shift(y, newest);
      std::memcpy(data, &newest, sizeof newest);
      if (!lane::any(all::is(newest))) {
        quiet = {};
        continue;
      }
      for (std::size_t part = 0; part < parts; ++part) {
        quiet[part] = is_small(data[part]) ? quiet[part] + 1 : 0;
        loud = loud && quiet[part] < order;
      }
    }
    y_ = y;
    quiet_ = quiet;
    return data;
  }

  /// All parts are quiet: up to the first sample that makes one of them louder, which is left to do.
  Real *run_quiet(Real *data, Real *end) noexcept {
    std::array<doubles, order> v;
    std::transform(y_.begin(), y_.end(), v.begin(), &all::steps);
    for (; data < end; data += parts) {
      doubles w{};
      if (lane::any_bit(std::bit_cast<typename lane::integers>(read(data)))) {
        if (!lane::all(all::is(read(data)))) break;
        w = all::steps(read(data));
      }
      const doubles newest = whole(rest(w, v), v);
      if (!lane::all(all::are_few(newest))) break;
      shift(v, newest);
      const reals y = all::value(newest);
      std::memcpy(data, &y, sizeof y);
    }
    std::transform(v.begin(), v.end(), y_.begin(), &all::value);
    return data;
  }

  /// One sample, part by part.
  Real *step_apart(Real *data) noexcept {
    for (std::size_t part = 0; part < parts; ++part, ++data) {
      std::array<Real, order> y;
      for (std::size_t j = 0; j < order; ++j) y[j] = lane::part(y_[j], part);
      if (quiet_[part] == order && is_small(*data)) {
        std::array<double, order> v;
        std::transform(y.begin(), y.end(), v.begin(), &one::steps);
        const double sum = rest(one::steps(*data), v), steps = whole(sum, v);
        if (one::are_few(steps) < 0) {
          *data = one::value(steps);
        } else {  // louder again, or not a number
          *data = static_cast<Real>(std::ldexp(sum - scaled_[0] * v[0], one::exponent));
          quiet_[part] = 0;
        }
      } else {
        *data = gain_ == 1 ? next<gain_kind::one>(*data, y) : next<gain_kind::any>(*data, y);
        quiet_[part] = is_small(*data) ? std::min(quiet_[part] + 1, order) : 0;
      }
      shift(y, *data);
      for (std::size_t j = 0; j < order; ++j) lane::part(y_[j], part) = y[j];
    }
    return data;
  }

  std::array<Real, order> a_;
  std::array<double, order> scaled_;
  Real gain_;
  std::array<reals, order> y_{};
  std::array<int, parts> quiet_{};
};

}  // namespace toolkit
