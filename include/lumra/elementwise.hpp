// Element by element over spans. SPDX-License-Identifier: MIT
//
// Outputs are as long as x and may be x where the elements are of one type; see elementwise.h. The type of the samples
// is named where vectors are passed: lumra::magnitude<std::complex<float>>(samples, levels).
#pragma once

#include <lumra/elementwise.h>
#include <lumra/object.hpp>

#include <cstdint>
#include <span>
#include <type_traits>

namespace lumra {

/// Lets the calling thread's functions of this header use other threads as long as this lives: 0 as many as pay, more
/// at most so many, 1 none. Then holds what held before. It begins and ends in one thread.
class [[nodiscard]] elementwise_threads {
 public:
  explicit elementwise_threads(std::uint32_t threads) : before_(lumra_elementwise_threads()) {
    check_open(lumra_elementwise_set_threads(threads));
  }
  elementwise_threads(const elementwise_threads &) = delete;
  elementwise_threads &operator=(const elementwise_threads &) = delete;
  ~elementwise_threads() { (void)lumra_elementwise_set_threads(before_); }

 private:
  std::uint32_t before_;
};

template <sample T>
void divide(std::span<const T> x, std::span<const T> y, std::span<T> out) {
  constexpr auto run = detail::form<T>(&lumra_divide_f32, &lumra_divide_f64, &lumra_divide_cf32, &lumra_divide_cf64);
  detail::require_length(y.size(), x.size());
  detail::require_length(out.size(), x.size());
  check_open(run(detail::raw(x.data()), detail::raw(y.data()), detail::raw(out.data()), x.size()));
}

template <sample T>
void scale(std::span<const T> x, real_type<T> factor, std::span<T> out) {
  constexpr auto run = detail::form<T>(&lumra_scale_f32, &lumra_scale_f64, &lumra_scale_cf32, &lumra_scale_cf64);
  detail::require_length(out.size(), x.size());
  check_open(run(detail::raw(x.data()), factor, detail::raw(out.data()), x.size()));
}

/// |x|.
template <sample T>
void magnitude(std::span<const T> x, std::span<real_type<T>> out) {
  constexpr auto run =
      detail::form<T>(&lumra_magnitude_f32, &lumra_magnitude_f64, &lumra_magnitude_cf32, &lumra_magnitude_cf64);
  detail::require_length(out.size(), x.size());
  check_open(run(detail::raw(x.data()), out.data(), x.size()));
}

/// |x|^2.
template <sample T>
void power(std::span<const T> x, std::span<real_type<T>> out) {
  constexpr auto run = detail::form<T>(&lumra_power_f32, &lumra_power_f64, &lumra_power_cf32, &lumra_power_cf64);
  detail::require_length(out.size(), x.size());
  check_open(run(detail::raw(x.data()), out.data(), x.size()));
}

/// 10 log10(|x|^2) + offset, in decibels.
template <sample T>
void decibels(std::span<const T> x, std::span<real_type<T>> out, real_type<T> offset = 0) {
  constexpr auto run =
      detail::form<T>(&lumra_log2_power_f32, &lumra_log2_power_f64, &lumra_log2_power_cf32, &lumra_log2_power_cf64);
  detail::require_length(out.size(), x.size());
  check_open(run(detail::raw(x.data()), static_cast<real_type<T>>(LUMRA_DECIBELS), offset, out.data(), x.size()));
}

/// c[0] + c[1] x + ...
template <sample T>
void polynomial(std::span<const T> x, std::span<const T> c, std::span<T> out) {
  constexpr auto run =
      detail::form<T>(&lumra_polynomial_f32, &lumra_polynomial_f64, &lumra_polynomial_cf32, &lumra_polynomial_cf64);
  detail::require_length(out.size(), x.size());
  check_open(run(detail::raw(x.data()), detail::raw(c.data()), c.size(), detail::raw(out.data()), x.size()));
}

/// x times the gains at the keys, interpolated in the table; T is complex.
template <sample T>
void lookup(std::span<const T> x, std::span<const real_type<T>> keys, std::span<const T> table, real_type<T> start,
            real_type<T> step, std::span<T> out) requires(!std::is_same_v<T, real_type<T>>) {
  constexpr auto run = detail::form<T>(0, 0, &lumra_lookup_cf32, &lumra_lookup_cf64);
  detail::require_length(keys.size(), x.size());
  detail::require_length(out.size(), x.size());
  check_open(run(detail::raw(x.data()), keys.data(), detail::raw(table.data()), table.size(), start, step,
                 detail::raw(out.data()), x.size()));
}

}  // namespace lumra
