// Filters over spans. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/filter.h>
#include <lumra/object.hpp>

#include <array>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <span>
#include <type_traits>
#include <utility>
#include <vector>

namespace lumra {

/// How sums of products are computed.
enum class products : std::int32_t {
  automatic = LUMRA_METHOD_AUTO,
  direct = LUMRA_METHOD_DIRECT,
  fourier = LUMRA_METHOD_FOURIER
};

namespace detail {
/// The object that load(bytes, size, &object) makes, which must be one for elements of T.
template <sample T, class Owned, class Load, class GetType>
Owned load(std::span<const std::byte> bytes, Load load, GetType get_type) {
  auto loaded = make<Owned>([&](auto **out) { return load(bytes.data(), bytes.size(), out); });
  std::int32_t type = 0;
  check_open(get_type(loaded.get(), &type));
  if (type != type_code<T>) throw error(status(LUMRA_WRONG_TYPE), "what was saved is for another type of samples");
  return loaded;
}
}  // namespace detail

/// A filter with a finite response over a stream of T; see filter.h. One thread at a time.
template <sample T>
class fir_filter {
 public:
  /// Real taps, also for complex samples.
  explicit fir_filter(std::span<const real_type<T>> taps, products method = products::automatic)
      : fir_filter(taps.data(), taps.size(), detail::type_code<real_type<T>>, method) {}
  explicit fir_filter(std::span<const T> taps,
                      products method = products::automatic) requires(!std::is_same_v<T, real_type<T>>)
      : fir_filter(taps.data(), taps.size(), detail::type_code<T>, method) {}

  /// Filters the stream's next samples; out has as many, and may be in.
  void operator()(std::span<const T> in, std::span<T> out) {
    detail::require_length(out.size(), in.size());
    check_open(lumra_fir_process(filter_.get(), in.data(), out.data(), in.size()));
  }
  [[nodiscard]] std::vector<T> operator()(std::span<const T> in) {
    std::vector<T> out(in.size());
    (*this)(in, out);
    return out;
  }
  void reset() { check_open(lumra_fir_reset(filter_.get())); }

  [[nodiscard]] std::vector<std::byte> save() const {
    return detail::save(filter_.get(), &lumra_fir_state_size, &lumra_fir_save);
  }
  /// A filter that goes on where the saved one was, which must be of T.
  [[nodiscard]] static fir_filter load(std::span<const std::byte> bytes) {
    return fir_filter(detail::load<T, owned>(bytes, &lumra_fir_load, &lumra_fir_get_type));
  }

 private:
  using owned = detail::owned<lumra_fir, &lumra_fir_free>;

  explicit fir_filter(owned filter) noexcept : filter_(std::move(filter)) {}
  fir_filter(const void *taps, std::size_t count, std::int32_t taps_type, products method)
      : filter_(detail::make<owned>([&](lumra_fir **out) {
          lumra_fir_options how = LUMRA_FIR_OPTIONS;
          how.type = detail::type_code<T>;
          how.taps_type = taps_type;
          how.method = static_cast<std::int32_t>(method);
          return lumra_fir_create(&how, taps, count, out);
        })) {}

  owned filter_;
};

/// Which part of a full convolution or correlation is kept.
enum class mode : std::int32_t { full = LUMRA_MODE_FULL, same = LUMRA_MODE_SAME, valid = LUMRA_MODE_VALID };

namespace detail {
template <class T, class Tap, class Run>
std::vector<T> combine(Run run, std::span<const T> x, std::span<const Tap> y, mode kept, products method) {
  const auto part = static_cast<std::int32_t>(kept);
  std::uint64_t count = 0;
  check_open(lumra_convolve_size(x.size(), y.size(), part, &count));
  std::vector<T> out(static_cast<std::size_t>(count));
  check_open(run(raw(x.data()), x.size(), raw(y.data()), y.size(), part, static_cast<std::int32_t>(method),
                 raw(out.data()), out.size()));
  return out;
}
}  // namespace detail

/// Of whole records, as scipy.signal's functions of these names.
template <sample T>
[[nodiscard]] std::vector<T> convolve(std::span<const T> x, std::type_identity_t<std::span<const T>> y,
                                      mode kept = mode::full, products method = products::automatic) {
  constexpr auto run =
      detail::form<T>(&lumra_convolve_f32, &lumra_convolve_f64, &lumra_convolve_cf32, &lumra_convolve_cf64);
  return detail::combine(run, x, y, kept, method);
}
template <sample T>
[[nodiscard]] std::vector<T> convolve(
    std::span<const T> x, std::type_identity_t<std::span<const real_type<T>>> y, mode kept = mode::full,
    products method = products::automatic) requires(!std::is_same_v<T, real_type<T>>) {
  constexpr auto run =
      detail::form<T>(nullptr, nullptr, &lumra_convolve_with_real_cf32, &lumra_convolve_with_real_cf64);
  return detail::combine(run, x, y, kept, method);
}
template <sample T>
[[nodiscard]] std::vector<T> correlate(std::span<const T> x, std::type_identity_t<std::span<const T>> y,
                                       mode kept = mode::full, products method = products::automatic) {
  constexpr auto run =
      detail::form<T>(&lumra_correlate_f32, &lumra_correlate_f64, &lumra_correlate_cf32, &lumra_correlate_cf64);
  return detail::combine(run, x, y, kept, method);
}

namespace detail {
template <class T, class Count, class Write, class... Values>
std::vector<T> design(Count count, Write write, Values... values) {
  std::uint64_t taps = 0;
  check_open(count(values..., &taps));
  std::vector<T> written(static_cast<std::size_t>(taps));
  check_open(write(values..., written.data(), written.size()));
  return written;
}
}  // namespace detail

/// Taps, of float or double, of a low pass by Kaiser's window: edges and rate in hertz, rejection in decibels.
template <std::floating_point T = double>
[[nodiscard]] std::vector<T> kaiser_lowpass(double sample_rate, double pass_edge, double stop_edge, double rejection) {
  constexpr auto write =
      detail::form<T>(&lumra_design_kaiser_lowpass_f32, &lumra_design_kaiser_lowpass_f64, nullptr, nullptr);
  return detail::design<T>(&lumra_design_kaiser_lowpass_count, write, sample_rate, pass_edge, stop_edge, rejection);
}

/// Taps of energy 1, of float or double: rates in hertz, span in symbols.
template <std::floating_point T = double>
[[nodiscard]] std::vector<T> root_raised_cosine(double sample_rate, double symbol_rate, double roll_off, double span) {
  constexpr auto write =
      detail::form<T>(&lumra_design_root_raised_cosine_f32, &lumra_design_root_raised_cosine_f64, nullptr, nullptr);
  return detail::design<T>(&lumra_design_root_raised_cosine_count, write, sample_rate, symbol_rate, roll_off, span);
}

enum class recursion : std::int32_t {
  automatic = LUMRA_IIR_AUTO,
  in_order = LUMRA_IIR_IN_ORDER,
  blocks = LUMRA_IIR_BLOCKS
};

/// A recursive filter over a stream of T; see filter_recursive.h. One thread at a time.
template <sample T>
class recursive_filter {
 public:
  using section = std::array<double, 6>;  // b[0], b[1], b[2], a[0], a[1], a[2]
  /// A state has its values in double precision, real or complex as the samples are.
  using state_value = std::conditional_t<std::is_floating_point_v<T>, double, std::complex<double>>;

  recursive_filter(std::span<const double> b, std::span<const double> a, recursion method = recursion::automatic)
      : filter_(detail::make<owned>([&](lumra_iir **out) {
          const lumra_iir_options how = options(method);
          return lumra_iir_create(&how, b.data(), b.size(), a.data(), a.size(), out);
        })) {}
  explicit recursive_filter(std::span<const section> sections, recursion method = recursion::automatic)
      : filter_(detail::make<owned>([&](lumra_iir **out) {
          const lumra_iir_options how = options(method);
          return lumra_iir_create_sections(&how, sections.empty() ? nullptr : sections.front().data(), sections.size(),
                                           out);
        })) {}

  /// Filters the stream's next samples; out has as many, and may be in.
  void operator()(std::span<const T> in, std::span<T> out) {
    detail::require_length(out.size(), in.size());
    check_open(lumra_iir_process(filter_.get(), in.data(), out.data(), in.size()));
  }
  [[nodiscard]] std::vector<T> operator()(std::span<const T> in) {
    std::vector<T> out(in.size());
    (*this)(in, out);
    return out;
  }

  void reset() { check_open(lumra_iir_reset(filter_.get())); }
  [[nodiscard]] recursion method() const {
    std::int32_t method = 0;
    check_open(lumra_iir_get_method(filter_.get(), &method));
    return static_cast<recursion>(method);
  }

  [[nodiscard]] std::vector<state_value> state() const {
    std::vector<state_value> values(detail::number_of(filter_.get(), &lumra_iir_order));
    check_open(lumra_iir_get_state(filter_.get(), values.data(), values.size()));
    return values;
  }
  void set_state(std::span<const state_value> values) {
    check_open(lumra_iir_set_state(filter_.get(), values.data(), values.size()));
  }

  [[nodiscard]] std::vector<std::byte> save() const {
    return detail::save(filter_.get(), &lumra_iir_state_size, &lumra_iir_save);
  }
  /// A filter that goes on where the saved one was, which must be of T.
  [[nodiscard]] static recursive_filter load(std::span<const std::byte> bytes) {
    return recursive_filter(detail::load<T, owned>(bytes, &lumra_iir_load, &lumra_iir_get_type));
  }

 private:
  using owned = detail::owned<lumra_iir, &lumra_iir_free>;

  explicit recursive_filter(owned filter) noexcept : filter_(std::move(filter)) {}
  static lumra_iir_options options(recursion method) noexcept {
    lumra_iir_options how = LUMRA_IIR_OPTIONS;
    how.type = detail::type_code<T>;
    how.method = static_cast<std::int32_t>(method);
    return how;
  }

  owned filter_;
};

}  // namespace lumra
