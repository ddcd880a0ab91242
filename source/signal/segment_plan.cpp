// SPDX-License-Identifier: MIT
#include "signal/segment_plan.hpp"

#include <algorithm>
#include <type_traits>
#include <utility>

#include "qsrfhs/vector/kernels/kernels.hpp"

namespace dsp {
namespace {

constexpr std::size_t radix = qsrfhs::kernels::radix, group = qsrfhs::kernels::radix_group;

template <class Sample>
std::size_t rows_for(std::size_t points) noexcept {
  if (!dsp::is_split<Sample>(points)) return 1;
  return is_complex<Sample> ? radix : radix / 2 + 1;
}

/// Into the order of the kernels' powers, or out of it.
template <class Real>
void order(Real *power, std::size_t n) noexcept {
  if constexpr (std::is_same_v<Real, float>) qsrfhs::kernels::exact().order_power(power, n);
}

}  // namespace

template <class Sample>
segment_plan<Sample>::segment_plan(qsrfhs::aligned_buffer<real> window)
    : rows_(rows_for<Sample>(window.size())),
      pass_(is_split() ? radix_pass<real>(window.size()) : radix_pass<real>()),
      row_(is_split() ? pass_.row() : window.size()),
      stride_(is_split() ? pass_.stride() : window.size()),
      window_(std::move(window)) {
  if (!is_split()) return;
  const qsrfhs::aligned_buffer<real> natural = std::exchange(window_, qsrfhs::aligned_buffer<real>(points()));
  for (std::size_t n = 0; n < row_; n += group)
    for (std::size_t r = 0; r < radix; ++r)
      std::copy_n(natural.data() + r * row_ + n, group, window_.data() + n * radix + r * group);
}

template <class Sample>
void segment_plan<Sample>::split(const Sample *x, bin *rows) const noexcept {
  const qsrfhs::kernels::radix_plan<real> plan = pass_.with(window_.data());
  const auto *const from = reinterpret_cast<const real *>(x);
  auto *const to = reinterpret_cast<real *>(rows);
  const auto &kernels = qsrfhs::kernels::fused();
  if constexpr (std::is_same_v<Sample, float>)
    kernels.windowed_real_radix_16(from, plan, to);
  else if constexpr (std::is_same_v<Sample, double>)
    kernels.windowed_real_radix_16_double(from, plan, to);
  else if constexpr (std::is_same_v<real, float>)
    kernels.windowed_radix_16(from, plan, to);
  else
    kernels.windowed_radix_16_double(from, plan, to);
}

/// Rows 0 and 8 of real samples have bins up to half the rate alone. They come last: the one bin more that row 0 has
/// leaves all others in whole groups.
template <class Sample>
auto segment_plan<Sample>::powers_of(std::size_t row) const noexcept -> range {
  if (!is_split()) return {0, bins(points())};
  if (is_complex<Sample>) return {row * row_, row_};
  const std::size_t half = row_ / 2;
  if (row == 0) return {15 * half, half + 1};
  return {(row - 1) * row_, row == 8 ? half : row_};
}

/// Groups of all bins r + 16 n with n below this are all bins, but for the one at half the rate.
template <class Sample>
std::size_t segment_plan<Sample>::columns() const noexcept {
  return is_complex<Sample> ? row_ : row_ / 2;
}

/// The powers of bins r + 16 n, r + 16 (n + 1) and so on.
template <class Sample>
auto segment_plan<Sample>::group_of(std::size_t r, std::size_t n) const noexcept -> group_place {
  if (r < rows_) return {powers_of(r).first + n, false};
  return {powers_of(radix - r).first + row_ - group - n, true};
}

template <class Sample>
void segment_plan<Sample>::to_bins(std::span<const real> power, std::span<real> bins) const noexcept {
  if (!is_split()) return to_state(power, bins);
  real tile[radix][group];
  for (std::size_t n = 0; n < columns(); n += group) {
    for (std::size_t r = 0; r < radix; ++r) {
      const group_place from = group_of(r, n);
      std::copy_n(power.data() + from.first, group, tile[r]);
      order(tile[r], group);
      if (from.reversed) std::reverse(tile[r], tile[r] + group);
    }
    for (std::size_t i = 0; i < group; ++i)
      for (std::size_t r = 0; r < radix; ++r) bins[(n + i) * radix + r] = tile[r][i];
  }
  if constexpr (!is_complex<Sample>) bins.back() = power.back();
}

template <class Sample>
void segment_plan<Sample>::to_state(std::span<const real> power, std::span<real> state) const noexcept {
  std::copy(power.begin(), power.end(), state.begin());
  order(state.data(), state.size());
}

template <class Sample>
void segment_plan<Sample>::from_state(std::span<const real> state, std::span<real> power) const noexcept {
  std::copy(state.begin(), state.end(), power.begin());
  order(power.data(), power.size());
}

template class segment_plan<float>;
template class segment_plan<double>;
template class segment_plan<std::complex<float>>;
template class segment_plan<std::complex<double>>;

}  // namespace dsp
