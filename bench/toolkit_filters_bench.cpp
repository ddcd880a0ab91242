// Recursive filters, decimation, statistics and matrices of the typed toolkit beside bare loops and bare MKL, on one
// thread. Ratios within one run count; figures of different runs do not compare. SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>
#include <mkl_cblas.h>
#include <mkl_lapack.h>
#include <lumra/lumra.hpp>

#include <algorithm>
#include <array>
#include <cmath>
#include <complex>
#include <cstring>
#include <numbers>
#include <vector>

#include "bench.hpp"

namespace {

using namespace bench;

template <class T>
lumra::host_array<T> array(std::initializer_list<double> from) {
  lumra::host_array<T> out(from.size());
  std::transform(from.begin(), from.end(), out.elements().begin(), [](double v) { return static_cast<T>(v); });
  return out;
}

template <class T>
void read(benchmark::State &state) {
  const auto n = static_cast<std::size_t>(state.range(0));
  const auto x = host_record<T>(n);
  const auto *words = reinterpret_cast<const std::uint64_t *>(x.elements().data());
  for (auto _ : state) {
    std::uint64_t sum[16] = {};
    for (std::size_t i = 0; i + 16 <= n * sizeof(T) / 8; i += 16)
      for (std::size_t l = 0; l < 16; ++l) sum[l] ^= words[i + l];
    benchmark::DoNotOptimize(sum);
  }
  rate(state, n, sizeof(T));
}

template <class T, auto decimate>
void average(benchmark::State &state) {
  const auto n = static_cast<std::size_t>(state.range(0));
  const auto x = host_record<T>(n);
  lumra::host_array<T> out(n / static_cast<std::size_t>(state.range(1)));
  for (auto _ : state) lumra::check(decimate(x.get(), out.get(), static_cast<std::int32_t>(state.range(1)), 1));
  rate(state, n, sizeof(T));
}

template <class T, class R, auto rms>
void root_mean_square(benchmark::State &state) {
  const auto n = static_cast<std::size_t>(state.range(0));
  const auto x = host_record<T>(n);
  R result = 0;
  for (auto _ : state) {
    lumra::check(rms(x.get(), &result));
    benchmark::DoNotOptimize(result);
  }
  rate(state, n, sizeof(T));
}

// ---- recursive filter of order 4

constexpr std::initializer_list<double> forward = {0.0465829066, 0.1863316265, 0.2794974397, 0.1863316265,
                                                   0.0465829066};
constexpr std::initializer_list<double> reverse = {1, -0.7820951980, 0.6799785269, -0.1826756978, 0.0301188750};

/// Data of which only the first samples are not zero when `tail` is set: all others are what rings on.
template <class T, class R, auto run>
void iir(benchmark::State &state, std::size_t n, bool tail, std::initializer_list<double> a) {
  auto data = host_record<T>(n);
  const auto original = host_record<T>(n);
  const auto b = array<R>(forward), reversed = array<R>(a);
  lumra::host_array<T> forward_state(0), reverse_state(0), saved(0);
  lumra::host_array<R> first(0), second(0);
  for (auto _ : state) {
    if (tail)
      std::fill(data.elements().begin(), data.elements().end(), T{});
    else
      std::copy(original.elements().begin(), original.elements().end(), data.elements().begin());
    if (tail) data.elements()[0] = static_cast<R>(20 * std::numeric_limits<R>::min());
    if constexpr (std::is_same_v<T, cf64>)
      lumra::check(run(data.get(), reversed.get(), b.get(), forward_state.get(), reverse_state.get(), 1, first.get(),
                       saved.get()));
    else
      lumra::check(run(data.get(), reversed.get(), b.get(), forward_state.get(), reverse_state.get(), 1, first.get(),
                       second.get(), saved.get()));
  }
  rate(state, n);
}

/// The difference equation as one would write it.
template <class T, class R>
void iir_loop(benchmark::State &state, std::size_t n, bool tail, std::initializer_list<double> a_list) {
  auto x = host_record<T>(n);
  if (tail) {
    std::fill(x.elements().begin(), x.elements().end(), T{});
    x.elements()[0] = static_cast<R>(20 * std::numeric_limits<R>::min());
  }
  std::vector<T> y(n);
  R a[5], b[5];
  std::transform(a_list.begin(), a_list.end(), a, [](double v) { return static_cast<R>(v); });
  std::transform(forward.begin(), forward.end(), b, [](double v) { return static_cast<R>(v); });
  for (auto _ : state) {
    const auto in = x.elements();
    for (std::size_t i = 4; i < n; ++i)
      y[i] = b[0] * in[i] + b[1] * in[i - 1] + b[2] * in[i - 2] + b[3] * in[i - 3] + b[4] * in[i - 4] -
             a[4] * y[i - 4] - a[3] * y[i - 3] - a[2] * y[i - 2] - a[1] * y[i - 1];
    benchmark::DoNotOptimize(y.data());
    benchmark::ClobberMemory();
  }
  rate(state, n);
}

// Rings down by seven decades in 16384 samples.
constexpr std::initializer_list<double> slow = {1, -0.999, 0, 0, 0};

// ---- matrices

template <class Block>
Block **matrix(std::int32_t type, std::int32_t rows, std::int32_t columns) {
  const std::int32_t sizes[] = {rows, columns};
  Block **out = nullptr;
  lumra::check(qsHost_ArrayNew(type, 2, sizes, &out));
  for (std::int32_t i = 0; i < rows * columns; ++i)
    (*out)->elements[i] = static_cast<float>(std::cos(0.37 * i + 1e-3 * (i % 1009) * (i % 1013)));
  return out;
}

void product(benchmark::State &state, bool bare) {
  constexpr std::int32_t n = 512;
  auto *a = matrix<lumra_f32_matrix_block>(LUMRA_TYPE_F32, n, n), *b = matrix<lumra_f32_matrix_block>(9, n, n),
       *c = matrix<lumra_f32_matrix_block>(9, n, n);
  for (auto _ : state) {
    if (bare)
      cblas_sgemm(CblasRowMajor, CblasNoTrans, CblasNoTrans, n, n, n, 1, (*a)->elements, n, (*b)->elements, n, 0,
                  (*c)->elements, n);
    else
      lumra::check(qsRFPELTA_sMtrxMulH(a, b, c));
  }
  rate(state, std::size_t{2} * n * n * n);
  for (auto **array : {&a, &b, &c}) qsHost_ArrayFree(array);
}

enum class solver { mkl, toolkit, open };

void least_squares(benchmark::State &state, solver who) {
  constexpr std::int32_t m = 200, n = 50;
  auto *a = matrix<lumra_f32_matrix_block>(LUMRA_TYPE_F32, m, n);
  std::uint32_t noise = 1;  // a matrix of full rank
  for (float &v : std::span((*a)->elements, std::size_t{m} * n)) {
    noise = noise * 1664525U + 1013904223U;
    v = static_cast<float>(noise >> 8) / 8388608.F - 1;
  }
  const auto b = host_record<float>(m);
  lumra::host_array<float> x(n), first(0), second(0), third(0);
  std::vector<float> copy(m * n), rhs(m), s(n), work(1);
  std::vector<MKL_INT> integers(1);
  const MKL_INT one = 1;
  const float tolerance = 1e-6F;
  MKL_INT size = -1, rank = 0, info = 0;
  sgelsd(&m, &n, &one, copy.data(), &m, rhs.data(), &m, s.data(), &tolerance, &rank, work.data(), &size,
         integers.data(), &info);
  size = static_cast<MKL_INT>(work[0]);
  work.resize(static_cast<std::size_t>(size));
  integers.resize(static_cast<std::size_t>(integers[0]));
  lumra::least_squares_solver<float> open_solver(m, n);
  const std::span<const float> rows((*a)->elements, copy.size());
  for (auto _ : state) {
    if (who == solver::mkl) {  // it destroys its matrix
      std::memcpy(copy.data(), (*a)->elements, copy.size() * sizeof(float));
      std::memcpy(rhs.data(), b.elements().data(), rhs.size() * sizeof(float));
      sgelsd(&m, &n, &one, copy.data(), &m, rhs.data(), &m, s.data(), &tolerance, &rank, work.data(), &size,
             integers.data(), &info);
    } else if (who == solver::open) {
      benchmark::DoNotOptimize(open_solver(rows, b.elements()));
    } else {
      lumra::check(qsRFPELTA_sLSEqH(a, b.get(), tolerance, x.get(), first.get(), second.get(), third.get()));
    }
  }
  rate(state, 1);
  qsHost_ArrayFree(&a);
}

constexpr std::int64_t large = 1 << 22;

BENCHMARK(read<float>)->Arg(large);
BENCHMARK(average<float, &qsRFPELTA_sDecimateH>)->ArgsProduct({{large}, {2, 3, 8, 31, 32, 100}});
BENCHMARK(root_mean_square<float, float, &qsRFPELTA_sRMSH>)->Arg(large);
BENCHMARK(read<double>)->Arg(large);
BENCHMARK(average<double, &qsRFPELTA_dDecimateH>)->ArgsProduct({{large}, {2, 8, 100}});
BENCHMARK(root_mean_square<double, double, &qsRFPELTA_dRMSH>)->Arg(large);
BENCHMARK(read<cf32>)->Arg(large);
BENCHMARK(average<cf32, &qsRFPELTA_cDecimateH>)->ArgsProduct({{large}, {2, 3, 8, 31, 32, 100}});
BENCHMARK(root_mean_square<cf32, float, &qsRFPELTA_cRMSH>)->Arg(large);
BENCHMARK(read<cf64>)->Arg(large);
BENCHMARK(average<cf64, &qsRFPELTA_zDecimateH>)->ArgsProduct({{large}, {2, 8, 100}});
BENCHMARK(root_mean_square<cf64, double, &qsRFPELTA_zRMSH>)->Arg(large);

#define IIR(NAME, T, R)                                                        \
  constexpr auto NAME##_loop = &iir_loop<T, R>;                                \
  constexpr auto NAME##_iir = &iir<T, R, &qsRFPELTA_##NAME##IIRDirectFilterH>; \
  BENCHMARK_CAPTURE(NAME##_loop, loud, 16384, false, reverse);                 \
  BENCHMARK_CAPTURE(NAME##_iir, loud, 16384, false, reverse);                  \
  BENCHMARK_CAPTURE(NAME##_loop, tail, 16384, true, slow);                     \
  BENCHMARK_CAPTURE(NAME##_iir, tail, 16384, true, slow)
IIR(ss, float, float);
IIR(dd, double, double);
IIR(cs, cf32, float);
IIR(zd, cf64, double);
#undef IIR

BENCHMARK_CAPTURE(product, mkl, true);
BENCHMARK_CAPTURE(product, lumra, false);
BENCHMARK_CAPTURE(least_squares, mkl, solver::mkl);
BENCHMARK_CAPTURE(least_squares, toolkit, solver::toolkit);
BENCHMARK_CAPTURE(least_squares, open, solver::open);

}  // namespace

BENCHMARK_MAIN();
