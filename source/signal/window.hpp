// Windows by number, in whole, and their figures. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/window.h>

#include <cstdint>
#include <optional>
#include <span>
#include <string_view>

namespace dsp {

/// A window's shape: its number, and the parameter of those that have one.
struct window_shape {
  std::int32_t type;
  double parameter = 0;
};

/// Periodic: one period of the window, for spectra. Symmetric: from its first zero to its last, for filters.
enum class window_span : std::int32_t { periodic = LUMRA_PERIODIC, symmetric = LUMRA_SYMMETRIC };

[[nodiscard]] bool is_window(std::int32_t type) noexcept;

/// Nothing for a name that is none. `kaiser:BETA` carries its parameter.
[[nodiscard]] std::optional<window_shape> find_window(std::string_view name) noexcept;

inline constexpr double largest_kaiser_beta = 700;  // beyond it the window has no double for its middle

/// Fills `out` with a known window. One value alone is 1.
template <class Real>
void make_window(const window_shape &shape, window_span span, std::span<Real> out) noexcept;

struct window_quality {
  double coherent_gain;    // mean of the values
  double noise_bandwidth;  // in bins
  double scalloping_loss;  // in dB, of a tone halfway between two bins
};

/// Of n values, at least 1.
[[nodiscard]] window_quality measure_window(const window_shape &shape, window_span span, std::uint64_t n) noexcept;

}  // namespace dsp
