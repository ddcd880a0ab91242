// SPDX-License-Identifier: MIT
#include "signal/segment_power.hpp"

#include <algorithm>
#include <type_traits>

#include "qsrfhs/vector/kernels/kernels.hpp"

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
      work_(plan.rows() * plan.stride()),
      spectrum_(is_complex<Sample> ? 0 : segment_plan<Sample>::bins(plan.points())),
      transform_(dfti_settings{.precision = sizeof(real) == sizeof(double) ? DFTI_DOUBLE : DFTI_SINGLE,
                               .domain = is_complex<Sample> ? DFTI_COMPLEX : DFTI_REAL,
                               .lengths = {static_cast<MKL_LONG>(plan.row()), 0},
                               .in_place = is_complex<Sample>}) {}

template <class Sample>
void segment_power<Sample>::finish(real *power, row_goes how, const Sample *next, std::size_t ahead,
                                   const qsrfhs::mkl_section &around) {
  if constexpr (!is_complex<Sample>) {
    transform_.forward(work_.data(), spectrum_.data(), around);
    write_power(spectrum_.data(), power, how, spectrum_.size());
  } else {
    const std::size_t n = plan_.row();
    if constexpr (std::is_same_v<Sample, cf32>) {
      if (next && plan_.rows() == 1) {
        // In one pass, so that neither goes through the caches twice.
        transform_.forward(work_.data(), around);
        const auto &kernels = qsrfhs::kernels::exact();
        return (how == row_goes::on_top ? kernels.accumulate_power_then_apply_window
                                        : kernels.store_power_then_apply_window)(
            floats(work_.data()), power, floats(next), plan_.window(), floats(next + n), ahead, n);
      }
    }
    // Powers while the row is in the first-level cache.
    for (std::size_t r = 0; r < plan_.rows(); ++r) {
      Sample *const row = work_.data() + r * plan_.stride();
      transform_.forward(row, around);
      write_power(row, power + r * n, how, n);
    }
  }
  if (next) begin(next);
}

template class segment_power<float>;
template class segment_power<double>;
template class segment_power<std::complex<float>>;
template class segment_power<std::complex<double>>;

}  // namespace dsp
