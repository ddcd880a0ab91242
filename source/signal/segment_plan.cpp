// SPDX-License-Identifier: MIT
#include "signal/segment_plan.hpp"

#include <algorithm>
#include <complex>
#include <type_traits>
#include <utility>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "signal/rotation.hpp"
#include "signal/weighting.hpp"

namespace dsp {
namespace {

constexpr std::size_t radix = qsrfhs::kernels::radix, group = qsrfhs::kernels::radix_group;

/// From here on the pass gains: it costs less than what transforms of all points lose to the second-level cache.
template <class Real>
constexpr std::size_t least_split = std::is_same_v<Real, float> ? 8192 : 2048;

template <class Sample>
std::size_t rows_for(std::size_t points) noexcept {
  if (!is_complex<Sample> || points < least_split<real_of<Sample>> || points % (radix * group) != 0) return 1;
  return radix;
}

/// A line of the caches between rows, which would lie in the same few lines of a cache otherwise.
template <class Sample>
constexpr std::size_t line = 64 / sizeof(Sample);

/// Into the order of the kernels' powers, or out of it.
template <class Real>
void order(Real *power, std::size_t n) noexcept {
  if constexpr (std::is_same_v<Real, float>) qsrfhs::kernels::exact().order_power(power, n);
}

}  // namespace

template <class Sample>
segment_plan<Sample>::segment_plan(qsrfhs::aligned_buffer<real> window)
    : rows_(rows_for<Sample>(window.size())),
      row_(window.size() / rows_),
      stride_(rows_ == 1 ? row_ : row_ + line<Sample>),
      window_(std::move(window)) {
  if (rows_ == 1) return;
  const qsrfhs::aligned_buffer<real> natural = std::exchange(window_, qsrfhs::aligned_buffer<real>(points()));
  for (std::size_t n = 0; n < row_; n += group)
    for (std::size_t r = 0; r < radix; ++r)
      std::copy_n(natural.data() + r * row_ + n, group, window_.data() + n * radix + r * group);

  const auto cycle = [&](std::size_t k, std::size_t n) {
    return on_circle(-static_cast<double>(k * n % points()) / static_cast<double>(points()));
  };
  columns_ = qsrfhs::aligned_buffer<real>(2 * radix * group);
  blocks_ = qsrfhs::aligned_buffer<real>(2 * row_);
  for (std::size_t k = 0; k < radix; ++k) {
    for (std::size_t n = 0; n < group; ++n) {
      const std::complex<double> turn = cycle(k, n);
      columns_.data()[2 * k * group + n] = static_cast<real>(turn.real());
      columns_.data()[2 * k * group + group + n] = static_cast<real>(turn.imag());
    }
    for (std::size_t n = 0; n < row_; n += group) {
      const std::complex<double> turn = cycle(k, n);
      blocks_.data()[2 * n + 2 * k] = static_cast<real>(turn.real());
      blocks_.data()[2 * n + 2 * k + 1] = static_cast<real>(turn.imag());
    }
  }
}

template <class Sample>
void segment_plan<Sample>::split(const Sample *x, Sample *rows) const noexcept {
  if (rows_ == 1) return weigh(x, window_.data(), rows, points());
  if constexpr (is_complex<Sample>) {
    const qsrfhs::kernels::radix_plan<real> plan{row_, stride_, window_.data(), columns_.data(), blocks_.data()};
    const auto *const from = reinterpret_cast<const real *>(x);
    auto *const to = reinterpret_cast<real *>(rows);
    const auto &kernels = qsrfhs::kernels::fused();
    if constexpr (std::is_same_v<real, float>)
      kernels.windowed_radix_16(from, plan, to);
    else
      kernels.windowed_radix_16_double(from, plan, to);
  }
}

template <class Sample>
void segment_plan<Sample>::to_bins(std::span<const real> power, std::span<real> bins) const noexcept {
  if (rows_ == 1) {
    std::copy(power.begin(), power.end(), bins.begin());
    return order(bins.data(), bins.size());
  }
  real tile[radix * group];
  for (std::size_t n = 0; n < row_; n += group) {
    for (std::size_t r = 0; r < radix; ++r) std::copy_n(power.data() + r * row_ + n, group, tile + r * group);
    order(tile, std::size(tile));
    for (std::size_t i = 0; i < group; ++i)
      for (std::size_t r = 0; r < radix; ++r) bins[(n + i) * radix + r] = tile[r * group + i];
  }
}

template <class Sample>
void segment_plan<Sample>::from_bins(std::span<const real> bins, std::span<real> power) const noexcept {
  if (rows_ == 1) {
    std::copy(bins.begin(), bins.end(), power.begin());
    return order(power.data(), power.size());
  }
  real tile[radix * group];
  for (std::size_t n = 0; n < row_; n += group) {
    for (std::size_t i = 0; i < group; ++i)
      for (std::size_t r = 0; r < radix; ++r) tile[r * group + i] = bins[(n + i) * radix + r];
    order(tile, std::size(tile));
    for (std::size_t r = 0; r < radix; ++r) std::copy_n(tile + r * group, group, power.data() + r * row_ + n);
  }
}

template class segment_plan<float>;
template class segment_plan<double>;
template class segment_plan<std::complex<float>>;
template class segment_plan<std::complex<double>>;

}  // namespace dsp
