// FIR filters of streams, convolution and correlation of the open interface beside liquid-dsp and, as the limit of long
// filters, bare MKL transforms, on one thread. Ratios within one run count; figures of different runs do not compare.
// SPDX-License-Identifier: MIT

#ifdef LUMRA_PEER_LIQUID
#include <liquid/liquid.h>
#endif

#include "bench.hpp"

namespace {

using namespace bench;

/// Arguments: taps, samples a call.
template <class Sample, class Tap>
void fir(benchmark::State &state, std::int32_t method) {
  const auto taps = record<Tap>(static_cast<std::size_t>(state.range(0)));
  const auto x = record<Sample>(static_cast<std::size_t>(state.range(1)));
  std::vector<Sample> out(x.size());
  lumra_fir_options options = LUMRA_FIR_OPTIONS;
  options.type = type_of<Sample>;
  options.taps_type = type_of<Tap>;
  options.method = method;
  lumra_fir *filter = nullptr;
  check(lumra_fir_create(&options, taps.data(), taps.size(), &filter) == LUMRA_SUCCESS);
  for (auto _ : state) check(lumra_fir_process(filter, x.data(), out.data(), x.size()) == LUMRA_SUCCESS);
  lumra_fir_free(filter);
  state.SetItemsProcessed(state.iterations() * state.range(1));
}

lumra_status convolve(const float *x, std::uint64_t nx, const float *y, std::uint64_t ny, std::int32_t method,
                      float *out) {
  return lumra_convolve_f32(x, nx, y, ny, LUMRA_MODE_FULL, method, out, nx + ny - 1);
}
lumra_status convolve(const double *x, std::uint64_t nx, const double *y, std::uint64_t ny, std::int32_t method,
                      double *out) {
  return lumra_convolve_f64(x, nx, y, ny, LUMRA_MODE_FULL, method, out, nx + ny - 1);
}
lumra_status convolve(const cf32 *x, std::uint64_t nx, const cf32 *y, std::uint64_t ny, std::int32_t method,
                      cf32 *out) {
  return lumra_convolve_cf32(reinterpret_cast<const lumra_cf32 *>(x), nx, reinterpret_cast<const lumra_cf32 *>(y), ny,
                             LUMRA_MODE_FULL, method, reinterpret_cast<lumra_cf32 *>(out), nx + ny - 1);
}
lumra_status convolve(const cf64 *x, std::uint64_t nx, const cf64 *y, std::uint64_t ny, std::int32_t method,
                      cf64 *out) {
  return lumra_convolve_cf64(reinterpret_cast<const lumra_cf64 *>(x), nx, reinterpret_cast<const lumra_cf64 *>(y), ny,
                             LUMRA_MODE_FULL, method, reinterpret_cast<lumra_cf64 *>(out), nx + ny - 1);
}

/// Arguments: both lengths.
template <class T>
void convolution(benchmark::State &state, std::int32_t method) {
  const auto x = record<T>(static_cast<std::size_t>(state.range(0)));
  const auto y = record<T>(static_cast<std::size_t>(state.range(1)));
  std::vector<T> out(x.size() + y.size() - 1);
  for (auto _ : state) check(convolve(x.data(), x.size(), y.data(), y.size(), method, out.data()) == LUMRA_SUCCESS);
  state.SetItemsProcessed(state.iterations() * state.range(0));
}

/// The two transforms of one block, bare. Argument: points.
void transforms(benchmark::State &state, bool double_precision, bool complex) {
  const auto points = static_cast<std::size_t>(state.range(0));
  std::vector<cf64> in(points + 1), out(points + 1);
  mkl_transform transform(points, double_precision, complex, false);
  for (auto _ : state) {
    transform.forward(in.data(), out.data());
    transform.backward(out.data(), in.data());
  }
  rate(state, points);
}

#ifdef LUMRA_PEER_LIQUID
void liquid_fir(benchmark::State &state) {
  auto taps = record<float>(static_cast<std::size_t>(state.range(0)));
  auto x = record<cf32>(static_cast<std::size_t>(state.range(1)));
  std::vector<cf32> out(x.size());
  const firfilt_crcf filter = firfilt_crcf_create(taps.data(), static_cast<unsigned>(taps.size()));
  for (auto _ : state)
    firfilt_crcf_execute_block(filter, reinterpret_cast<liquid_float_complex *>(x.data()),
                               static_cast<unsigned>(x.size()), reinterpret_cast<liquid_float_complex *>(out.data()));
  firfilt_crcf_destroy(filter);
  state.SetItemsProcessed(state.iterations() * state.range(1));
}

void liquid_fir_real(benchmark::State &state) {
  auto taps = record<float>(static_cast<std::size_t>(state.range(0)));
  auto x = record<float>(static_cast<std::size_t>(state.range(1)));
  std::vector<float> out(x.size());
  const firfilt_rrrf filter = firfilt_rrrf_create(taps.data(), static_cast<unsigned>(taps.size()));
  for (auto _ : state) firfilt_rrrf_execute_block(filter, x.data(), static_cast<unsigned>(x.size()), out.data());
  firfilt_rrrf_destroy(filter);
  state.SetItemsProcessed(state.iterations() * state.range(1));
}

/// Its filter by transforms, in blocks as long as the taps.
void liquid_blocks(benchmark::State &state) {
  auto taps = record<float>(static_cast<std::size_t>(state.range(0)));
  const auto block = static_cast<unsigned>(taps.size());
  auto x = record<cf32>(block);
  std::vector<cf32> out(block);
  const fftfilt_crcf filter = fftfilt_crcf_create(taps.data(), block, block);
  for (auto _ : state)
    fftfilt_crcf_execute(filter, reinterpret_cast<liquid_float_complex *>(x.data()),
                         reinterpret_cast<liquid_float_complex *>(out.data()));
  fftfilt_crcf_destroy(filter);
  state.SetItemsProcessed(state.iterations() * block);
}
BENCHMARK(liquid_fir_real)->ArgsProduct({{16, 64, 128}, {16384}});
BENCHMARK(liquid_fir)->ArgsProduct({{16, 32, 64, 128, 1000}, {16384}});
BENCHMARK(liquid_fir)->Args({1000, 1});
BENCHMARK(liquid_blocks)->Arg(128)->Arg(1000)->Arg(5000);
#endif

constexpr auto real_fir = &fir<float, float>;
constexpr auto complex_fir = &fir<cf32, float>;
constexpr auto complex_taps_fir = &fir<cf32, cf32>;
constexpr auto double_fir = &fir<double, double>;
constexpr auto complex_double_fir = &fir<cf64, double>;

BENCHMARK_CAPTURE(real_fir, automatic, LUMRA_METHOD_AUTO)->ArgsProduct({{1, 16, 64, 128, 1000, 5000}, {16384}});
BENCHMARK_CAPTURE(complex_fir, automatic, LUMRA_METHOD_AUTO)
    ->ArgsProduct({{1, 16, 32, 64, 128, 1000, 5000}, {16384}})
    ->ArgsProduct({{16, 64, 1000, 5000}, {1, 16, 256}})
    ->Args({128, 128})
    ->Args({1000, 1000})
    ->Args({5000, 5000});
BENCHMARK_CAPTURE(complex_fir, direct, LUMRA_METHOD_DIRECT)->Args({128, 16384})->Args({1000, 16384})->Args({1000, 1});
BENCHMARK_CAPTURE(complex_fir, fourier, LUMRA_METHOD_FOURIER)->ArgsProduct({{16, 64}, {16384}});
BENCHMARK_CAPTURE(complex_taps_fir, automatic, LUMRA_METHOD_AUTO)->ArgsProduct({{16, 64, 1000}, {16384}});
BENCHMARK_CAPTURE(double_fir, automatic, LUMRA_METHOD_AUTO)->ArgsProduct({{16, 64, 1000}, {16384}});
BENCHMARK_CAPTURE(complex_double_fir, automatic, LUMRA_METHOD_AUTO)->ArgsProduct({{16, 64, 1000}, {16384}});

#define CONVOLUTION(T)                                                            \
  constexpr auto T##_convolution = &convolution<T>;                               \
  BENCHMARK_CAPTURE(T##_convolution, automatic, LUMRA_METHOD_AUTO)                \
      ->ArgsProduct({{1000, 10000, 100000, 1000000}, {16, 50, 300, 1000, 5000}}); \
  BENCHMARK_CAPTURE(T##_convolution, direct, LUMRA_METHOD_DIRECT)                 \
      ->Args({10000, 16})                                                         \
      ->Args({10000, 50})                                                         \
      ->Args({10000, 300});                                                       \
  BENCHMARK_CAPTURE(T##_convolution, fourier, LUMRA_METHOD_FOURIER)               \
      ->Args({10000, 16})                                                         \
      ->Args({10000, 50})                                                         \
      ->Args({10000, 300})
CONVOLUTION(float);
CONVOLUTION(double);
CONVOLUTION(cf32);
CONVOLUTION(cf64);
#undef CONVOLUTION

BENCHMARK_CAPTURE(transforms, real_single, false, false)->RangeMultiplier(2)->Range(256, 1 << 17);
BENCHMARK_CAPTURE(transforms, complex_single, false, true)->RangeMultiplier(2)->Range(256, 1 << 17);
BENCHMARK_CAPTURE(transforms, real_double, true, false)->RangeMultiplier(2)->Range(256, 1 << 17);
BENCHMARK_CAPTURE(transforms, complex_double, true, true)->RangeMultiplier(2)->Range(256, 1 << 17);

}  // namespace

BENCHMARK_MAIN();
