// SPDX-License-Identifier: MIT
#include "signal/segment_power.hpp"

#include <algorithm>
#include <type_traits>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "signal/weighting.hpp"

namespace dsp {
namespace {

using cf32 = std::complex<float>;

const float *floats(const cf32 *x) noexcept {
  return reinterpret_cast<const float *>(x);
}
float *floats(cf32 *x) noexcept {
  return reinterpret_cast<float *>(x);
}

template <class Real>
void write_power(const std::complex<Real> *x, Real *power, row_goes how, std::size_t n) noexcept {
  if constexpr (std::is_same_v<Real, float>) {
    const auto &kernels = qsrfhs::kernels::exact();
    (how == row_goes::on_top ? kernels.accumulate_power : kernels.store_power)(floats(x), power, n);
  } else {
    if (how == row_goes::in) std::fill_n(power, n, Real{});
    for (std::size_t k = 0; k < n; ++k) power[k] += x[k].real() * x[k].real() + x[k].imag() * x[k].imag();
  }
}

}  // namespace

template <class Sample>
segment_power<Sample>::segment_power(const segment_plan<Sample> &plan)
    : plan_(plan),
      real_(has_real_transform() ? plan.points() : 0),
      rows_(has_real_transform() ? segment_plan<Sample>::bins(plan.points()) : plan.rows() * plan.stride()),
      transform_(dfti_settings{.precision = sizeof(real) == sizeof(double) ? DFTI_DOUBLE : DFTI_SINGLE,
                               .domain = has_real_transform() ? DFTI_REAL : DFTI_COMPLEX,
                               .lengths = {static_cast<MKL_LONG>(plan.row()), 0},
                               .in_place = !has_real_transform()}) {}

template <class Sample>
void segment_power<Sample>::begin(const Sample *x) noexcept {
  if (plan_.is_split()) return plan_.split(x, rows_.data());
  if constexpr (is_complex<Sample>)
    weigh(x, plan_.window(), rows_.data(), plan_.points());
  else
    weigh(x, plan_.window(), real_.data(), plan_.points());
}

template <class Sample>
void segment_power<Sample>::finish(real *power, row_goes how, const Sample *next, std::size_t ahead,
                                   const qsrfhs::mkl_section &around) {
  if constexpr (std::is_same_v<Sample, cf32>) {
    if (next && !plan_.is_split()) {
      // Powers and window in one pass: the segment goes through the caches once.
      transform_.forward(rows_.data(), around);
      const auto &kernels = qsrfhs::kernels::exact();
      const std::size_t n = plan_.points();
      return (how == row_goes::on_top ? kernels.accumulate_power_then_apply_window
                                      : kernels.store_power_then_apply_window)(
          floats(rows_.data()), power, floats(next), plan_.window(), floats(next + n), ahead, n);
    }
  }
  // Powers of a row while it is in the first-level cache.
  for (std::size_t r = 0; r < plan_.rows(); ++r) {
    std::complex<real> *const row = rows_.data() + r * plan_.stride();
    if (has_real_transform())
      transform_.forward(real_.data(), row, around);
    else
      transform_.forward(row, around);
    const auto powers = plan_.powers_of(r);
    write_power(row, power + powers.first, how, powers.count);
  }
  if (next) begin(next);
}

template class segment_power<float>;
template class segment_power<double>;
template class segment_power<std::complex<float>>;
template class segment_power<std::complex<double>>;

}  // namespace dsp
