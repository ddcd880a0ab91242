// Windows over spans. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/window.h>
#include <lumra/error.hpp>

#include <cstdint>
#include <span>
#include <string>
#include <vector>

namespace lumra {

/// A window's shape by its name in window.h, such as "hann" or "kaiser:8.6".
struct window_shape {
  std::int32_t type = LUMRA_WINDOW_RECTANGULAR;
  double parameter = 0;

  window_shape() = default;
  explicit window_shape(lumra_window_type number, double with_parameter = 0) noexcept
      : type(number), parameter(with_parameter) {}
  window_shape(const std::string &name) { check_open(lumra_window_by_name(name.c_str(), &type, &parameter)); }
  window_shape(const char *name) : window_shape(std::string(name)) {}
};

enum class window_span : std::int32_t { periodic = LUMRA_PERIODIC, symmetric = LUMRA_SYMMETRIC };

/// Fills `out`.
inline void make_window(const window_shape &shape, std::span<float> out, window_span span = window_span::periodic) {
  check_open(
      lumra_window_make_f32(shape.type, shape.parameter, static_cast<std::int32_t>(span), out.data(), out.size()));
}
inline void make_window(const window_shape &shape, std::span<double> out, window_span span = window_span::periodic) {
  check_open(
      lumra_window_make_f64(shape.type, shape.parameter, static_cast<std::int32_t>(span), out.data(), out.size()));
}

/// n values; T is float or double.
template <class T = double>
[[nodiscard]] std::vector<T> make_window(const window_shape &shape, std::size_t n,
                                         window_span span = window_span::periodic) {
  std::vector<T> values(n);
  make_window(shape, std::span<T>(values), span);
  return values;
}

/// Of n values.
[[nodiscard]] inline lumra_window_quality window_figures(const window_shape &shape, std::uint64_t n,
                                                         window_span span = window_span::periodic) {
  lumra_window_quality figures{};
  check_open(lumra_window_figures(shape.type, shape.parameter, static_cast<std::int32_t>(span), n, &figures));
  return figures;
}

}  // namespace lumra
