// SPDX-License-Identifier: MIT
#include "signal/window.hpp"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <complex>
#include <iterator>
#include <numbers>

#include "signal/bessel.hpp"
#include "signal/cosine_window.hpp"

namespace dsp {
namespace {

struct named_window {
  std::string_view name;
  std::int32_t type;
};

constexpr named_window names[] = {
    {"boxcar", LUMRA_WINDOW_RECTANGULAR},
    {"none", LUMRA_WINDOW_RECTANGULAR},
    {"rectangular", LUMRA_WINDOW_RECTANGULAR},
    {"hann", LUMRA_WINDOW_HANN},
    {"hamming", LUMRA_WINDOW_HAMMING},
    {"blackmanharris3", LUMRA_WINDOW_BLACKMAN_HARRIS_3},
    {"exact_blackman", LUMRA_WINDOW_EXACT_BLACKMAN},
    {"blackman", LUMRA_WINDOW_BLACKMAN},
    {"flattop_toolkit", LUMRA_WINDOW_TOOLKIT_FLAT_TOP},
    {"blackmanharris", LUMRA_WINDOW_BLACKMAN_HARRIS_4},
    {"blackmanharris7", LUMRA_WINDOW_BLACKMAN_HARRIS_7},
    {"low_sidelobe", LUMRA_WINDOW_LOW_SIDELOBE},
    {"nuttall", LUMRA_WINDOW_BLACKMAN_NUTTALL},
    {"flattop", LUMRA_WINDOW_SESSION_FLAT_TOP},
    {"kaiser", LUMRA_WINDOW_KAISER},
};

/// Samples from one end of the window to where it repeats; 0 for a window of one value.
std::uint64_t period_of(window_span span, std::uint64_t n) noexcept {
  return span == window_span::periodic ? n : n - 1;
}

/// A window's value at a place in its period, in [0, 1].
class window_function {
 public:
  explicit window_function(const window_shape &shape) noexcept
      : beta_(shape.type == LUMRA_WINDOW_KAISER ? std::optional(shape.parameter) : std::nullopt),
        peak_(beta_ ? bessel_i0(*beta_) : 1),
        sum_(cosine_sums[beta_ ? 0 : shape.type]) {
    std::array<double, 4 * std::size(cosine_sum{}.a)> tables;
    if (sum_.terms == 1) return;
    expand(sum_, 1.0, std::span(tables).first(expansion_size(sum_)));
    std::copy_n(tables.begin(), sum_.terms, coefficients_.begin());
  }

  [[nodiscard]] double operator()(double place) const noexcept {
    if (beta_) {
      const double x = 2 * place - 1;
      return bessel_i0(*beta_ * std::sqrt(std::max(0.0, (1 - x) * (1 + x)))) / peak_;
    }
    if (sum_.terms == 1) return 1;
    const double sine = std::sin(std::numbers::pi * place);
    double w = 0;
    for (std::int32_t k = sum_.terms; k-- > 0;) w = w * sine * sine + coefficients_[static_cast<std::size_t>(k)];
    return w;
  }
  [[nodiscard]] bool is_kaiser() const noexcept { return beta_.has_value(); }
  [[nodiscard]] const cosine_sum &sum() const noexcept { return sum_; }
  [[nodiscard]] const double *coefficients() const noexcept { return coefficients_.data(); }

 private:
  std::optional<double> beta_;
  double peak_;
  const cosine_sum &sum_;
  std::array<double, std::size(cosine_sum{}.a)> coefficients_{};
};

}  // namespace

bool is_window(std::int32_t type) noexcept {
  if (type == LUMRA_WINDOW_KAISER) return true;
  return type >= 0 && type < static_cast<std::int32_t>(std::size(cosine_sums)) && cosine_sums[type].terms != 0;
}

std::optional<window_shape> find_window(std::string_view name) noexcept {
  const std::size_t colon = name.find(':');
  const std::string_view word = name.substr(0, colon);
  const auto *const found =
      std::find_if(std::begin(names), std::end(names), [word](const named_window &w) { return w.name == word; });
  if (found == std::end(names)) return std::nullopt;
  if (colon == std::string_view::npos) return window_shape{found->type};
  const char *const first = name.data() + colon + 1, *const last = name.data() + name.size();
  window_shape shape{found->type};
  const auto read = std::from_chars(first, last, shape.parameter);
  const bool whole = read.ec == std::errc() && read.ptr == last && first != last;
  if (!whole || shape.type != LUMRA_WINDOW_KAISER) return std::nullopt;
  return shape;
}

template <class Real>
void make_window(const window_shape &shape, window_span span, std::span<Real> out) noexcept {
  const window_function w(shape);
  std::fill(out.begin(), out.end(), Real{1});
  const std::uint64_t period = period_of(span, out.size());
  if (out.size() <= 1 || (!w.is_kaiser() && w.sum().terms == 1)) return;
  if (w.is_kaiser()) {
    for (std::uint64_t k = 0; k <= period / 2; ++k) {
      const auto value = static_cast<Real>(w(static_cast<double>(k) / static_cast<double>(period)));
      out[k] = value;
      if (k > 0 && period - k < out.size()) out[period - k] = value;
    }
    if (span == window_span::symmetric) out[period] = out[0];
    return;
  }
  multiply_by(w.sum(), w.coefficients(), out.data(), static_cast<std::int64_t>(period));
  if (span == window_span::symmetric) out[period] = out[0];
}
template void make_window(const window_shape &, window_span, std::span<float>) noexcept;
template void make_window(const window_shape &, window_span, std::span<double>) noexcept;

window_quality measure_window(const window_shape &shape, window_span span, std::uint64_t n) noexcept {
  const window_function w(shape);
  const std::uint64_t period = period_of(span, n);
  double sum = 0, squares = 0;
  std::complex<double> between = 0;  // the transform half a bin away from 0
  for (std::uint64_t k = 0; k < n; ++k) {
    const double value = n == 1 ? 1 : w(static_cast<double>(k) / static_cast<double>(period));
    sum += value;
    squares += value * value;
    between += std::polar(value, -std::numbers::pi * static_cast<double>(k) / static_cast<double>(n));
  }
  const auto count = static_cast<double>(n);
  return {sum / count, count * squares / (sum * sum), 20 * std::log10(sum / std::abs(between))};
}

}  // namespace dsp
