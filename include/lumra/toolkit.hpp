// The typed toolkit over blocks. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/toolkit.h>
#include <lumra/host_array.hpp>

#include <algorithm>
#include <array>
#include <complex>
#include <cstdint>
#include <span>
#include <type_traits>
#include <utility>

namespace lumra {

// The typed toolkit over spans. T is float, double or std::complex of one of them; the export is chosen by it.

enum class part : std::int32_t { full = 0, same = 1, valid = 2 };
enum class method : std::int32_t { direct = 0, fourier = 1 };
enum class normalisation : std::int32_t { none = 0, unbiased = 1, biased = 2 };
enum class shift : std::int32_t { none = 0, centred = 1 };

/// Sum-of-cosines windows of apply_window.
enum class cosine_window : std::int32_t {
  rectangular = 0,
  hann = 1,
  hamming = 2,
  blackman_harris_3 = 3,
  exact_blackman = 4,
  blackman = 5,
  flat_top = 6,
  blackman_harris_4 = 7,
  blackman_harris_7 = 8,
  low_sidelobe = 9,
  blackman_nuttall = 11,
};

namespace detail {
template <class T>
struct parts {
  using real = T;
  using complex = std::complex<T>;
};
template <class T>
struct parts<std::complex<T>> {
  using real = T;
  using complex = std::complex<T>;
};
template <class T>
using real_of = typename parts<T>::real;
template <class T>
using complex_of = typename parts<T>::complex;
template <class T, class U>
using common_of = std::conditional_t<std::is_floating_point_v<T>, U, T>;

template <class T>
inline constexpr int letter = std::is_same_v<T, float>    ? 0
                              : std::is_same_v<T, double> ? 1
                              : sizeof(T) == 8            ? 2
                                                          : 3;

/// The one of four exports that has T's letter: s, d, c, z.
template <class T, class S, class D, class C, class Z>
constexpr auto choose(S s, D d, C c, Z z) noexcept {
  if constexpr (letter<T> == 0)
    return s;
  else if constexpr (letter<T> == 1)
    return d;
  else if constexpr (letter<T> == 2)
    return c;
  else
    return z;
}
}  // namespace detail

/// What the toolkit keeps between calls: work arrays and the latest transform. Calls of equal lengths and types with
/// one plan make no new transform and, once the arrays have grown, no new memory. One thread at a time.
template <class T>
class plan {
 public:
  plan() = default;
  plan(plan &&other) noexcept
      : x(std::move(other.x)),
        y(std::move(other.y)),
        out(std::move(other.out)),
        bins(std::move(other.bins)),
        magnitudes(std::move(other.magnitudes)),
        scratch(std::move(other.scratch)),
        transform_scratch(std::move(other.transform_scratch)),
        bins_scratch(std::move(other.bins_scratch)),
        tables(std::move(other.tables)),
        slot_(std::exchange(other.slot_, nullptr)) {}
  plan &operator=(plan &&) = delete;
  ~plan() { qsHost_ReleaseTransform(&slot_); }

  [[nodiscard]] void **slot() noexcept { return &slot_; }

  // Results of the functions below lie in out, bins and magnitudes until the next call with the plan.
  host_array<T> x{0}, y{0}, out{0};
  host_array<detail::complex_of<T>> bins{0};
  host_array<detail::real_of<T>> magnitudes{0};
  host_array<T> scratch{0}, transform_scratch{0};
  host_array<detail::complex_of<T>> bins_scratch{0};
  host_array<double> tables{0};

 private:
  void *slot_ = nullptr;
};

namespace detail {
template <class T>
void load(host_array<T> &to, std::type_identity_t<std::span<const T>> from) {
  to.resize(from.size());
  std::copy(from.begin(), from.end(), to.elements().begin());
}
}  // namespace detail

/// Bins of the discrete Fourier transform of size points (0: as many as samples).
template <class T>
std::span<const detail::complex_of<T>> fft(plan<T> &plan, std::type_identity_t<std::span<const T>> samples,
                                           std::int32_t size = 0, shift order = shift::none) {
  constexpr auto run =
      detail::choose<T>(&qsRFPELTA_s1DFFTH, &qsRFPELTA_d1DFFTH, &qsRFPELTA_c1DFFTH, &qsRFPELTA_z1DFFTH);
  detail::load(plan.x, samples);
  check(run(plan.x.get(), plan.bins.get(), size, static_cast<std::int32_t>(order), plan.scratch.get(), plan.slot()));
  return plan.bins.elements();
}

/// The record, of type T, that has these bins.
template <class T>
std::span<const T> inverse_fft(plan<T> &plan, std::type_identity_t<std::span<const detail::complex_of<T>>> spectrum,
                               shift order = shift::none) {
  constexpr auto run =
      detail::choose<T>(&qsRFPELTA_s1DInvFFTH, &qsRFPELTA_d1DInvFFTH, &qsRFPELTA_c1DInvFFTH, &qsRFPELTA_z1DInvFFTH);
  // A spectrum that the plan itself holds needs no copy.
  if (spectrum.data() != plan.bins.elements().data() || spectrum.size() != plan.bins.size())
    detail::load(plan.bins, spectrum);
  check(run(plan.bins.get(), plan.out.get(), static_cast<std::int32_t>(order), plan.bins_scratch.get(), plan.slot()));
  return plan.out.elements();
}

template <class T>
std::span<const T> convolve(plan<T> &plan, std::type_identity_t<std::span<const T>> x,
                            std::type_identity_t<std::span<const T>> y, part kept = part::full,
                            method how = method::fourier, std::int32_t block_size = 0) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_s1DConvolutionH, &qsRFPELTA_d1DConvolutionH,
                                         &qsRFPELTA_c1DConvolutionH, &qsRFPELTA_z1DConvolutionH);
  detail::load(plan.x, x);
  detail::load(plan.y, y);
  check(run(plan.x.get(), plan.y.get(), plan.out.get(), static_cast<std::int32_t>(kept), static_cast<std::int32_t>(how),
            block_size, plan.scratch.get(), plan.transform_scratch.get(), plan.slot()));
  return plan.out.elements();
}

/// Cross-correlation; the plan has the type of the lags. One of the two records may be real where the lags are complex.
template <class T, class X, class Y>
std::span<const T> correlate(plan<T> &plan, std::span<X> x, std::span<Y> y, normalisation norm = normalisation::none,
                             method how = method::fourier, std::int32_t block_size = 0) {
  using first = std::remove_const_t<X>;
  using second = std::remove_const_t<Y>;
  static_assert(std::is_same_v<T, detail::common_of<first, second>>, "the plan must have the type of the lags");
  host_array<first> real_x(0);
  host_array<second> real_y(0);
  const auto call = [&](auto run, auto &from_x, auto &from_y) {
    detail::load(from_x, x);
    detail::load(from_y, y);
    check(run(from_x.get(), from_y.get(), plan.out.get(), static_cast<std::int32_t>(how),
              static_cast<std::int32_t>(norm), block_size, plan.scratch.get(), plan.transform_scratch.get(),
              plan.slot()));
  };
  if constexpr (std::is_same_v<first, second>) {
    call(detail::choose<T>(&qsRFPELTA_s1DCorrelationH, &qsRFPELTA_d1DCorrelationH, &qsRFPELTA_c1DCorrelationH,
                           &qsRFPELTA_z1DCorrelationH),
         plan.x, plan.y);
  } else if constexpr (std::is_floating_point_v<first>) {
    static_assert(std::is_same_v<std::complex<first>, second>, "one precision");
    call(detail::choose<T>(0, 0, &qsRFPELTA_sc1DCorrelationH, &qsRFPELTA_dz1DCorrelationH), real_x, plan.y);
  } else {
    static_assert(std::is_same_v<first, std::complex<second>>, "one precision");
    call(detail::choose<T>(0, 0, &qsRFPELTA_cs1DCorrelationH, &qsRFPELTA_zd1DCorrelationH), plan.x, real_y);
  }
  return plan.out.elements();
}

/// |X[k]|^2 / N^2, bin 0 first.
template <class T>
std::span<const detail::real_of<T>> power_spectrum(plan<T> &plan, std::type_identity_t<std::span<const T>> samples) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sPowerSpectrumH, &qsRFPELTA_dPowerSpectrumH,
                                         &qsRFPELTA_cPowerSpectrumH, &qsRFPELTA_zPowerSpectrumH);
  detail::load(plan.x, samples);
  check(run(plan.x.get(), plan.magnitudes.get(), plan.scratch.get(), plan.slot()));
  return plan.magnitudes.elements();
}

/// The samples times a window; with `normalised` its first coefficient is 1.
template <class T>
std::span<const T> apply_window(plan<T> &plan, std::type_identity_t<std::span<const T>> samples, cosine_window type,
                                bool normalised = false) {
  constexpr auto run =
      detail::choose<T>(&qsRFPELTA_sAllCosWinH, &qsRFPELTA_dAllCosWinH, &qsRFPELTA_cAllCosWinH, &qsRFPELTA_zAllCosWinH);
  detail::load(plan.out, samples);
  check(run(plan.out.get(), static_cast<std::int32_t>(type), normalised, plan.tables.get()));
  return plan.out.elements();
}

enum class interpolation : std::int32_t { linear = 0, nearest = 1 };

/// A stream of T at another rate. One thread at a time.
template <class T>
class resampler {
 public:
  struct settings {
    float ratio = 1;  // input samples per output sample
    float delay = 0;  // of the first output, in input samples
    lumra::interpolation interpolation = lumra::interpolation::linear;
    bool bandwidth_scaling = true;
  };

  /// `prototype` has `phases` coefficients per input sample.
  resampler(std::type_identity_t<std::span<const detail::real_of<T>>> prototype, std::int32_t phases,
            const settings &how)
      : phases_(phases), how_(how) {
    prototype_.resize(prototype.size());
    std::copy(prototype.begin(), prototype.end(), prototype_.elements().begin());
  }

  /// The outputs that the next block of the stream gives; good until the next call.
  std::span<const T> operator()(std::type_identity_t<std::span<const T>> block) {
    constexpr auto run = detail::choose<T>(&qsRFPELTA_sResampleC2CH, &qsRFPELTA_dResampleC2CH, &qsRFPELTA_cResampleC2CH,
                                           &qsRFPELTA_zResampleC2CH);
    detail::load(in_, block);
    const lumra_resampler_parameters parameters{how_.ratio, how_.delay, static_cast<std::int32_t>(how_.interpolation)};
    const bool reset = std::exchange(reset_, true);  // again after a failure
    check(run(in_.get(), prototype_.get(), phases_, &parameters, reset, how_.bandwidth_scaling, out_.get(), &time_,
              samples_.get(), taps_.get(), state_.data()));
    reset_ = false;
    return out_.elements();
  }
  /// Position of the latest block's first output, in input samples since the beginning.
  [[nodiscard]] float first_output_time() const noexcept { return time_; }
  /// The next block begins a new stream.
  void reset() noexcept { reset_ = true; }

 private:
  std::int32_t phases_;
  settings how_;
  bool reset_ = true;
  float time_ = 0;
  std::array<unsigned char, LUMRA_RESAMPLER_STATE_SIZE> state_{};
  host_array<detail::real_of<T>> prototype_{0}, taps_{0};
  host_array<T> in_{0}, out_{0}, samples_{0};
};

/// A direct-form filter with its memory: coefficients b over a. One thread at a time.
template <class T>
class iir_filter {
 public:
  using coefficients = std::type_identity_t<std::span<const detail::real_of<T>>>;

  iir_filter(coefficients b, coefficients a) {
    forward_.resize(b.size());
    reverse_.resize(a.size());
    std::copy(b.begin(), b.end(), forward_.elements().begin());
    std::copy(a.begin(), a.end(), reverse_.elements().begin());
  }

  /// The next block of the stream, filtered; good until the next call.
  std::span<const T> operator()(std::type_identity_t<std::span<const T>> block) {
    detail::load(data_, block);
    const std::int32_t reset = std::exchange(reset_, false);
    constexpr auto run = detail::choose<T>(&qsRFPELTA_ssIIRDirectFilterH, &qsRFPELTA_ddIIRDirectFilterH,
                                           &qsRFPELTA_csIIRDirectFilterH, &qsRFPELTA_zdIIRDirectFilterH);
    if constexpr (std::is_same_v<T, std::complex<double>>)
      check(run(data_.get(), reverse_.get(), forward_.get(), inputs_.get(), outputs_.get(), reset,
                forward_scratch_.get(), saved_.get()));
    else
      check(run(data_.get(), reverse_.get(), forward_.get(), inputs_.get(), outputs_.get(), reset,
                forward_scratch_.get(), reverse_scratch_.get(), saved_.get()));
    return data_.elements();
  }
  /// The next block begins a new stream.
  void reset() noexcept { reset_ = true; }

 private:
  bool reset_ = true;
  host_array<detail::real_of<T>> forward_{0}, reverse_{0}, forward_scratch_{0}, reverse_scratch_{0};
  host_array<T> data_{0}, inputs_{0}, outputs_{0}, saved_{0};
};

/// Every `factor`-th sample, or the means of `factor` samples.
template <class T>
host_array<T> decimate(const host_array<T> &samples, std::int32_t factor, bool average) {
  constexpr auto run =
      detail::choose<T>(&qsRFPELTA_sDecimateH, &qsRFPELTA_dDecimateH, &qsRFPELTA_cDecimateH, &qsRFPELTA_zDecimateH);
  host_array<T> out(0);
  check(run(samples.get(), out.get(), factor, average));
  return out;
}

template <class T>
detail::real_of<T> rms(const host_array<T> &samples) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sRMSH, &qsRFPELTA_dRMSH, &qsRFPELTA_cRMSH, &qsRFPELTA_zRMSH);
  detail::real_of<T> result = 0;
  check(run(samples.get(), &result));
  return result;
}

enum class fit_method : std::int32_t { least_squares = 0, least_absolute = 1, bisquare = 2 };

template <class T>
struct fitted_line {
  T slope = 0, intercept = 0, residue = 0;
  std::int32_t iterations = 0;
};

/// Replaces y by the line's values. No weights: all points count alike.
template <class T>
fitted_line<T> linear_fit(host_array<T> &y, const host_array<T> &x, const host_array<T> &weights = host_array<T>(0),
                          fit_method method = fit_method::least_squares, float tolerance = 0, float iterations = 0) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sLinearFitH, &qsRFPELTA_dLinearFitH, 0, 0);
  host_array<T> scratch(0);
  fitted_line<T> line;
  check(run(y.get(), x.get(), weights.get(), &line.slope, &line.intercept, &line.residue,
            static_cast<std::int32_t>(method), tolerance, iterations, &line.iterations, scratch.get()));
  return line;
}

/// T is float or std::complex<float>, here and below.
template <class T>
host_matrix<T> multiply(const host_matrix<T> &a, const host_matrix<T> &b) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sMtrxMulH, 0, &qsRFPELTA_cMtrxMulH, 0);
  host_matrix<T> product(0, 0);
  check(run(a.get(), b.get(), product.get()));
  return product;
}

template <class T>
host_array<T> multiply(const host_matrix<T> &a, const host_array<T> &x) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sMtrxVecMulH, 0, &qsRFPELTA_cMtrxVecMulH, 0);
  host_array<T> product(0);
  check(run(a.get(), x.get(), product.get()));
  return product;
}

/// The shortest x that makes |a x - b| smallest; singular values up to `tolerance` times the largest count as zero.
template <class T>
host_array<T> least_squares(const host_matrix<T> &a, const host_array<T> &b, float tolerance = 0) {
  constexpr auto run = detail::choose<T>(&qsRFPELTA_sLSEqH, 0, &qsRFPELTA_cLSEqH, 0);
  host_array<T> x(0), matrix(0), rhs(0), work(0);
  check(run(a.get(), b.get(), tolerance, x.get(), matrix.get(), rhs.get(), work.get()));
  return x;
}

}  // namespace lumra
