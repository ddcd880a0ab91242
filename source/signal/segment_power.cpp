// SPDX-License-Identifier: MIT
#include "signal/segment_power.hpp"

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
segment_power<Sample>::segment_power(std::span<const real> window)
    : window_(window),
      work_(window.size()),
      spectrum_(is_complex<Sample> ? 0 : bins(window.size())),
      transform_(dfti_settings{.precision = sizeof(real) == sizeof(double) ? DFTI_DOUBLE : DFTI_SINGLE,
                               .domain = is_complex<Sample> ? DFTI_COMPLEX : DFTI_REAL,
                               .lengths = {static_cast<MKL_LONG>(window.size()), 0},
                               .in_place = is_complex<Sample>}) {}

template <class Sample>
void segment_power<Sample>::begin(const Sample *x) noexcept {
  weigh(x, window_.data(), work_.data(), window_.size());
}

template <class Sample>
void segment_power<Sample>::finish(real *power, row_goes how, const Sample *next, std::size_t ahead,
                                   const qsrfhs::mkl_section &around) {
  const std::size_t n = window_.size();
  if constexpr (std::is_same_v<Sample, cf32>) {
    transform_.forward(work_.data(), around);
    const auto &kernels = qsrfhs::kernels::exact();
    float *const work = floats(work_.data());
    if (!next) return write_power(work_.data(), power, how, n);
    (how == row_goes::on_top ? kernels.accumulate_power_then_apply_window : kernels.store_power_then_apply_window)(
        work, power, floats(next), window_.data(), floats(next + n), ahead, n);
  } else if constexpr (is_complex<Sample>) {
    transform_.forward(work_.data(), around);
    write_power(work_.data(), power, how, n);
    if (next) begin(next);
  } else {
    transform_.forward(work_.data(), spectrum_.data(), around);
    write_power(spectrum_.data(), power, how, spectrum_.size());
    if (next) begin(next);
  }
}

template <class Sample>
void segment_power<Sample>::order(std::span<real> power) noexcept {
  if constexpr (std::is_same_v<real, float>) qsrfhs::kernels::exact().order_power(power.data(), power.size());
}

template class segment_power<float>;
template class segment_power<double>;
template class segment_power<std::complex<float>>;
template class segment_power<std::complex<double>>;

}  // namespace dsp
