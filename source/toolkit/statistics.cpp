// Root mean square, and straight lines through points. SPDX-License-Identifier: MIT
#include <lumra/toolkit.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <functional>
#include <limits>
#include <span>

#include "toolkit/frame.hpp"
#include "toolkit/lanes.hpp"

namespace toolkit {
namespace {

/// Sum of squares of real samples in four lanes of the type, the rest in order.
template <class Real>
Real sum_of_squares(const Real *x, std::int64_t n) noexcept {
  using four = lanes<Real, 4>;
  four sum;
  std::int64_t i = 0;
  for (; i + 4 <= n; i += 4) sum += four::load(x + i) * four::load(x + i);
  Real total = sum.folded();
  for (; i < n; ++i) total += x[i] * x[i];
  return total;
}

/// The same of real and imaginary parts, without an order to keep: blocks in the type, their sums in double.
template <class Real>
double sum_of_squares(const std::complex<Real> *x, std::int64_t n) noexcept {
  constexpr std::int64_t width = 64 / sizeof(Real), block = 4096;
  using register_block = lanes<Real, width>;
  const auto *parts = reinterpret_cast<const Real *>(x);
  double total = 0;
  for (std::int64_t first = 0; first < 2 * n; first += block) {
    const std::int64_t end = std::min(first + block, 2 * n);
    register_block whole;
    std::int64_t i = first;
    for (; i + width <= end; i += width) whole += register_block::load(parts + i) * register_block::load(parts + i);
    auto sum = whole.values();
    for (std::size_t l = 0; i < end; ++i, ++l) sum[l] += parts[i] * parts[i];
    for (const Real lane : sum) total += static_cast<double>(lane);
  }
  return total;
}

template <class E>
void root_mean_square(input<E> x, result<real_of<E>> &rms) {
  const std::int64_t n = x.count();
  require(n >= 1, empty_input);
  const auto root = static_cast<double>(std::sqrt(sum_of_squares(x.values().data(), n)));
  rms.set(static_cast<real_of<E>>(root / std::sqrt(static_cast<double>(n))));
}

using iteration_count = result<std::int32_t, failed_result::zero>;

enum class fit_method : std::int32_t { least_squares = 0, least_absolute = 1, bisquare = 2 };

/// f(x) = mean_y + slope (x - mean_x): the reference point lies among the data, so that nothing cancels far from 0.
struct line {
  double slope = 0, mean_x = 0, mean_y = 0;

  [[nodiscard]] double at(double x) const noexcept { return mean_y + slope * (x - mean_x); }
  [[nodiscard]] double intercept() const noexcept { return mean_y - slope * mean_x; }
};

template <class Real>
struct points {
  std::span<const Real> x, y;

  [[nodiscard]] double deviation(std::size_t i, const line &f) const noexcept {
    return static_cast<double>(y[i]) - f.at(static_cast<double>(x[i]));
  }
};

/// Least squares; without weights all points count alike. False when those that count have one x.
template <class Real>
bool fit(const points<Real> &p, std::span<const Real> weights, line &out) noexcept {
  const std::size_t n = p.x.size();
  const auto weight = [&](std::size_t i) { return weights.empty() ? 1.0 : static_cast<double>(weights[i]); };
  const auto x = [&](std::size_t i) { return static_cast<double>(p.x[i]); };
  const auto y = [&](std::size_t i) { return static_cast<double>(p.y[i]); };
  double sum = 0;
  std::size_t first = n, other = n;  // points that count, at two x
  for (std::size_t i = 0; i < n; ++i) {
    sum += weight(i);
    if (!(weight(i) > 0)) continue;
    if (first == n) first = i;
    if (x(i) != x(first)) other = i;
  }
  if (other == n) return false;
  line f;
  for (std::size_t i = 0; i < n; ++i) {  // weighted first: sums of large values do not overflow
    f.mean_x += weight(i) / sum * x(i);
    f.mean_y += weight(i) / sum * y(i);
  }
  double width = 0;
  for (std::size_t i = 0; i < n; ++i)
    if (weight(i) > 0) width = std::max(width, std::abs(x(i) - f.mean_x));
  // The means are rounded; du and dv take that back.
  double du = 0, dv = 0, uu = 0, uv = 0;
  for (std::size_t i = 0; i < n; ++i) {
    const double w = weight(i) / sum, u = (x(i) - f.mean_x) / width, v = y(i) - f.mean_y;
    du += w * u;
    dv += w * v;
    uu += w * u * u;
    uv += w * u * v;
  }
  const double slope = (uv - du * dv) / (uu - du * du);  // per width
  f.slope = slope / width;
  f.mean_y += dv - slope * du;
  out = f;
  return true;
}

/// A line by repeated least squares, each time with weights that follow from the deviations of the line before. `room`
/// holds these weights, and in between what the median is taken of.
template <class Real>
class reweighted_fit {
 public:
  reweighted_fit(const points<Real> &p, std::span<const Real> weights, double tolerance, std::span<Real> room)
      : p_(p), weights_(weights), room_(room), tolerance_(tolerance) {
    for (const Real w : weights) largest_weight_ = std::max(largest_weight_, static_cast<double>(w));
    for (std::size_t i = 0; i < room.size(); ++i) room[i] = static_cast<Real>(given(i));
    require(fit<Real>(p_, room, line_), too_few_points);
    double largest = 0;
    for (const Real y : p.y) largest = std::max(largest, std::abs(static_cast<double>(y) - line_.mean_y));
    least_ = std::max(largest * static_cast<double>(std::numeric_limits<Real>::epsilon()),
                      std::numeric_limits<double>::min());
  }

  [[nodiscard]] const line &result() const noexcept { return line_; }
  [[nodiscard]] std::int32_t iterations() const noexcept { return iterations_; }

  /// Up to `most` repetitions in all.
  void repeat(fit_method method, std::int32_t most) {
    double before = std::numeric_limits<double>::infinity();
    while (iterations_ < most) {
      if (method == fit_method::bisquare)
        weigh_bisquare();
      else
        weigh_absolute();
      if (!fit<Real>(p_, room_, line_)) return;  // too few points are left to change anything
      ++iterations_;
      const double now = spread();
      if (std::abs(before - now) <= tolerance_ * now || now <= least_ * least_) return;
      before = now;
    }
  }

 private:
  [[nodiscard]] double given(std::size_t i) const noexcept {
    return weights_.empty() ? 1.0 : static_cast<double>(weights_[i]) / largest_weight_;
  }
  [[nodiscard]] double deviation(std::size_t i) const noexcept { return std::abs(p_.deviation(i, line_)); }

  void weigh_absolute() noexcept {
    for (std::size_t i = 0; i < room_.size(); ++i)
      room_[i] = static_cast<Real>(given(i) * (least_ / std::max(deviation(i), least_)));
  }

  void weigh_bisquare() noexcept {
    std::size_t count = 0;
    for (std::size_t i = 0; i < room_.size(); ++i)
      if (given(i) > 0) room_[count++] = static_cast<Real>(deviation(i));
    const auto middle = room_.begin() + static_cast<std::ptrdiff_t>(count / 2);
    std::nth_element(room_.begin(), middle, room_.begin() + static_cast<std::ptrdiff_t>(count));
    const double reach = 6.95 * std::max(static_cast<double>(*middle), least_);
    for (std::size_t i = 0; i < room_.size(); ++i) {
      const double u = deviation(i) / reach;
      const double inside = std::max(1.0 - u * u, 0.0);
      room_[i] = static_cast<Real>(given(i) * inside * inside);
    }
  }

  /// Weighted mean of the squared deviations.
  [[nodiscard]] double spread() const noexcept {
    double sum = 0, weights = 0;
    for (std::size_t i = 0; i < room_.size(); ++i) {
      sum += static_cast<double>(room_[i]) * deviation(i) * deviation(i);
      weights += static_cast<double>(room_[i]);
    }
    return sum / weights;
  }

  const points<Real> &p_;
  std::span<const Real> weights_;
  std::span<Real> room_;
  double tolerance_, largest_weight_ = 0, least_ = 0;
  std::int32_t iterations_ = 0;
  line line_;
};

template <class Real>
void check_weights(std::span<const Real> weights) {
  for (const Real w : weights) {
    require(!(w < 0), bad_option);
    require(std::isfinite(w), not_finite);
  }
  require(weights.empty() || std::any_of(weights.begin(), weights.end(), [](Real w) { return w > 0; }), bad_option);
}

struct fit_options {
  std::int32_t method;
  float tolerance, most_iterations;
};

template <class E>
struct fit_results {
  result<real_of<E>> slope, intercept, residue;
  iteration_count iterations;

  void clear() noexcept {
    slope.clear();
    intercept.clear();
    residue.clear();
    iterations.clear();
  }
};

template <class E>
void linear_fit(output<E> &record, const input<E> &x, const input<E> &w, const fit_options &options,
                fit_results<E> &results, scratch<E> room) {
  using real = real_of<E>;
  const auto y = record.values();
  const points<real> p{x.values(), y};
  const std::span<const real> weights = w.values();
  require(options.method >= 0 && options.method <= 2, bad_option);
  const auto method = static_cast<fit_method>(options.method);
  require(p.x.size() == y.size() && (weights.empty() || weights.size() == y.size()), lengths_differ);
  require(y.size() >= 2, too_few_points);
  const auto usable = [](real v) { return std::abs(v) < std::numeric_limits<real>::max(); };
  require(std::all_of(p.x.begin(), p.x.end(), usable) && std::all_of(y.begin(), y.end(), usable), not_finite);
  check_weights(weights);
  refuse_sharing(room, record, x, w);
  const bool alike = std::adjacent_find(weights.begin(), weights.end(), std::not_equal_to<>()) == weights.end();

  line f;
  results.iterations.set(0);
  if (method == fit_method::least_squares && alike) {
    require(fit<real>(p, {}, f), too_few_points);
  } else {
    const double tolerance = options.tolerance > 0 ? static_cast<double>(options.tolerance) : 1e-4;
    // Below 2^31 as a float.
    const auto most =
        options.most_iterations >= 1 ? static_cast<std::int32_t>(std::min(options.most_iterations, 2e9F)) : 100;
    reweighted_fit<real> lines(p, weights, tolerance, room.resize(static_cast<std::int64_t>(y.size())));
    if (method == fit_method::least_absolute) lines.repeat(method, most);
    if (method == fit_method::bisquare) {
      lines.repeat(fit_method::least_absolute, most / 2);
      lines.repeat(method, most);
    }
    f = lines.result();
    results.iterations.set(lines.iterations());
  }
  require(std::isfinite(f.slope) && std::isfinite(f.intercept()), not_finite);

  double squares = 0, sum = 0;
  const double largest = weights.empty() ? 1.0 : static_cast<double>(*std::max_element(weights.begin(), weights.end()));
  for (std::size_t i = 0; i < y.size(); ++i) {
    const double weight = weights.empty() ? 1.0 : static_cast<double>(weights[i]) / largest;
    const auto fitted = static_cast<real>(f.at(static_cast<double>(p.x[i])));
    const double deviation = static_cast<double>(y[i]) - static_cast<double>(fitted);
    squares += weight * deviation * deviation;
    sum += weight;
    y[i] = fitted;
  }
  results.slope.set(static_cast<real>(f.slope));
  results.intercept.set(static_cast<real>(f.intercept()));
  results.residue.set(static_cast<real>(squares / sum));
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define RMS(E)                                                                                                  \
  int32_t qsRFPELTA_##E##RMSH(handle<E> data, E::real *value) {                                                 \
    return toolkit_call([&](result<E::real> &rms) { root_mean_square<E>(data, rms); }, result<E::real>(value)); \
  }
RMS(s)
RMS(d)
RMS(c)
RMS(z)
#undef RMS

#define LINEAR_FIT(E)                                                                                                 \
  int32_t qsRFPELTA_##E##LinearFitH(handle<E> y, handle<E> x, handle<E> weights, E::real *slope, E::real *intercept,  \
                                    E::real *residue, int32_t method, float tuning1, float tuning2,                   \
                                    int32_t *iterations, handle<E> scratch) {                                         \
    const fit_options options{method, tuning1, tuning2};                                                              \
    return toolkit_call([&](output<E> &record,                                                                        \
                            fit_results<E> &fitted) { linear_fit<E>(record, x, weights, options, fitted, scratch); }, \
                        output<E>(y),                                                                                 \
                        fit_results<E>{result<E::real>(slope), result<E::real>(intercept), result<E::real>(residue),  \
                                       iteration_count(iterations)});                                                 \
  }
LINEAR_FIT(s)
LINEAR_FIT(d)
#undef LINEAR_FIT
