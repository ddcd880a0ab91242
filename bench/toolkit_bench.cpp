// The typed toolkit beside bare MKL (the limit) and FFTW, on one thread. Ratios within one run count; figures of
// different runs do not compare. SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>
#include <mkl_cblas.h>
#include <mkl_dfti.h>
#include <lumra/lumra.hpp>
#ifdef LUMRA_PEER_FFTW
#include <fftw3.h>
#endif

#include <algorithm>
#include <cmath>
#include <complex>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <numbers>
#include <vector>

#include "bench.hpp"

namespace {

using namespace bench;

template <class T>
using bin_of = std::conditional_t<is_double<T>, cf64, cf32>;
template <class T>
using part_of = std::conditional_t<is_double<T>, double, float>;

template <class T, class S, class D, class C, class Z>
constexpr auto pick(S s, D d, C c, Z z) {
  if constexpr (std::is_same_v<T, float>)
    return s;
  else if constexpr (std::is_same_v<T, double>)
    return d;
  else if constexpr (std::is_same_v<T, cf32>)
    return c;
  else
    return z;
}

template <class T>
void fft(benchmark::State &state) {
  const auto n = static_cast<std::size_t>(state.range(0));
  auto x = host_record<T>(n);
  lumra::host_array<bin_of<T>> y(n);
  void *slot = nullptr;
  const auto run = pick<T>(&qsRFPELTA_s1DFFTH, &qsRFPELTA_d1DFFTH, &qsRFPELTA_c1DFFTH, &qsRFPELTA_z1DFFTH);
  for (auto _ : state) lumra::check(run(x.get(), y.get(), 0, 0, nullptr, &slot));
  qsHost_ReleaseTransform(&slot);
  rate(state, n);
}

template <class T>
void fft_mkl(benchmark::State &state) {
  const auto n = static_cast<std::size_t>(state.range(0));
  auto x = host_record<T>(n);
  lumra::host_array<bin_of<T>> y(n);
  mkl_transform transform(n, is_double<T>, is_complex<T>, false);
  for (auto _ : state) transform.forward(x.elements().data(), y.elements().data());
  rate(state, n);
}

template <class T>
void fft_mkl_in_place(benchmark::State &state) {
  const auto n = static_cast<std::size_t>(state.range(0));
  lumra::host_array<bin_of<T>> y(n + 2);
  mkl_transform transform(n, is_double<T>, is_complex<T>, true);
  for (auto _ : state) transform.forward(y.elements().data());
  rate(state, n);
}

#ifdef LUMRA_PEER_FFTW
template <class T>
void fft_fftw(benchmark::State &state) {
  const auto size = static_cast<int>(state.range(0));
  auto x = host_record<T>(static_cast<std::size_t>(size));
  lumra::host_array<bin_of<T>> y(static_cast<std::size_t>(size) + 1);
  auto *in = x.elements().data();
  auto *out = y.elements().data();
  constexpr unsigned how = FFTW_MEASURE;
  if constexpr (is_double<T>) {
    auto *bins = reinterpret_cast<fftw_complex *>(out);
    fftw_plan plan;
    if constexpr (is_complex<T>)
      plan = fftw_plan_dft_1d(size, reinterpret_cast<fftw_complex *>(in), bins, FFTW_FORWARD, how);
    else
      plan = fftw_plan_dft_r2c_1d(size, in, bins, how);
    for (auto _ : state) fftw_execute(plan);
    fftw_destroy_plan(plan);
  } else {
    auto *bins = reinterpret_cast<fftwf_complex *>(out);
    fftwf_plan plan;
    if constexpr (is_complex<T>)
      plan = fftwf_plan_dft_1d(size, reinterpret_cast<fftwf_complex *>(in), bins, FFTW_FORWARD, how);
    else
      plan = fftwf_plan_dft_r2c_1d(size, in, bins, how);
    for (auto _ : state) fftwf_execute(plan);
    fftwf_destroy_plan(plan);
  }
  rate(state, static_cast<std::size_t>(size));
}
#endif

template <class T>
void power_spectrum(benchmark::State &state) {
  const auto n = static_cast<std::size_t>(state.range(0));
  auto x = host_record<T>(n);
  lumra::host_array<part_of<T>> p(n);
  lumra::host_array<T> scratch(0);
  void *slot = nullptr;
  const auto run = pick<T>(&qsRFPELTA_sPowerSpectrumH, &qsRFPELTA_dPowerSpectrumH, &qsRFPELTA_cPowerSpectrumH,
                           &qsRFPELTA_zPowerSpectrumH);
  lumra::check(run(x.get(), p.get(), scratch.get(), &slot));
  for (auto _ : state) lumra::check(run(x.get(), p.get(), scratch.get(), &slot));
  qsHost_ReleaseTransform(&slot);
  rate(state, n);
}

template <class T>
void window(benchmark::State &state) {
  const auto n = static_cast<std::size_t>(state.range(0));
  lumra::host_array<T> x(n);  // zeros: windowing again and again would end in denormals
  lumra::host_array<double> scratch(0);
  const auto run =
      pick<T>(&qsRFPELTA_sAllCosWinH, &qsRFPELTA_dAllCosWinH, &qsRFPELTA_cAllCosWinH, &qsRFPELTA_zAllCosWinH);
  for (auto _ : state) lumra::check(run(x.get(), static_cast<std::int32_t>(state.range(1)), 0, scratch.get()));
  rate(state, n);
}

/// The least that windowing by recurrences costs: reading and writing the record.
void window_limit(benchmark::State &state) {
  const auto n = static_cast<std::size_t>(state.range(0));
  lumra::host_array<double> x(n);
  double *data = x.elements().data();
  for (auto _ : state) {
    for (std::size_t i = 0; i < n; ++i) data[i] *= 0.5;
    benchmark::ClobberMemory();
  }
  rate(state, n);
}

template <class T>
void convolution(benchmark::State &state) {
  const auto nx = static_cast<std::size_t>(state.range(0)), ny = static_cast<std::size_t>(state.range(1));
  auto x = host_record<T>(nx);
  auto y = host_record<T>(ny);
  lumra::host_array<T> out(nx + ny - 1), room(0);
  void *slot = nullptr;
  const auto run = pick<T>(&qsRFPELTA_s1DConvolutionH, &qsRFPELTA_d1DConvolutionH, &qsRFPELTA_c1DConvolutionH,
                           &qsRFPELTA_z1DConvolutionH);
  for (auto _ : state)
    lumra::check(
        run(x.get(), y.get(), out.get(), 0, static_cast<std::int32_t>(state.range(2)), 0, nullptr, room.get(), &slot));
  qsHost_ReleaseTransform(&slot);
  rate(state, nx);
}

void bare_axpy(benchmark::State &state) {
  const auto nx = static_cast<std::size_t>(state.range(0)), ny = static_cast<std::size_t>(state.range(1));
  auto x = host_record<float>(nx);
  lumra::host_array<float> out(nx + ny - 1);
  float *const to = out.elements().data();
  for (auto _ : state) {
    std::fill_n(to, nx + ny - 1, 0.F);
    for (std::size_t i = 0; i < ny; ++i) cblas_saxpy(static_cast<int>(nx), 0.5F, x.elements().data(), 1, to + i, 1);
  }
  rate(state, nx);
}

/// Two forward transforms and one backward one of the convolution's length, and nothing else.
void three_transforms(benchmark::State &state) {
  const auto n = static_cast<std::size_t>(state.range(2)), nx = static_cast<std::size_t>(state.range(0));
  auto time = aligned<float>(n + 2), one = aligned<float>(n + 2), two = aligned<float>(n + 2);
  std::fill_n(time.get(), n + 2, 0.5F);
  mkl_transform transform(n, false, false, false);
  for (auto _ : state) {
    transform.forward(time.get(), one.get());
    transform.forward(time.get(), two.get());
    transform.backward(one.get(), time.get());
    std::memset(time.get(), 0, 16);
  }
  rate(state, nx);
}

void transform_sizes(benchmark::internal::Benchmark *b) {
  for (const int n : {16, 1024, 4096, 16384, 65536, 105000, 1 << 20}) b->Arg(n);
}

#ifdef LUMRA_PEER_FFTW
#define FFT(T)                                            \
  BENCHMARK(fft_mkl_in_place<T>)->Apply(transform_sizes); \
  BENCHMARK(fft_mkl<T>)->Apply(transform_sizes);          \
  BENCHMARK(fft<T>)->Apply(transform_sizes);              \
  BENCHMARK(fft_fftw<T>)->Apply(transform_sizes)
#else
#define FFT(T)                                            \
  BENCHMARK(fft_mkl_in_place<T>)->Apply(transform_sizes); \
  BENCHMARK(fft_mkl<T>)->Apply(transform_sizes);          \
  BENCHMARK(fft<T>)->Apply(transform_sizes)
#endif
FFT(float);
FFT(cf32);
FFT(double);
FFT(cf64);

BENCHMARK(power_spectrum<float>)->Apply(transform_sizes);
BENCHMARK(power_spectrum<cf32>)->Apply(transform_sizes);

BENCHMARK(window_limit)->Arg(1 << 20);
BENCHMARK(window<double>)->Args({1 << 20, 6})->Args({1 << 20, 8})->Args({1 << 20, 1})->Args({1024, 6});
BENCHMARK(window<float>)->Args({1 << 20, 6});
BENCHMARK(window<cf32>)->Args({1 << 20, 6});

BENCHMARK(three_transforms)->Args({100000, 5000, 105000});
BENCHMARK(convolution<float>)->Args({100000, 5000, 1});
BENCHMARK(bare_axpy)->Args({100000, 64});
BENCHMARK(convolution<float>)->Args({100000, 64, 0});

}  // namespace

BENCHMARK_MAIN();
