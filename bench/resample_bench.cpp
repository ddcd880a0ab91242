// Resampling by 1.37 with 32 taps of 64 phases beside what others do for the same ratio, on one thread.
// SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>
#include <lumra/lumra.hpp>

#include <array>
#include <cmath>
#include <complex>
#include <numbers>
#include <vector>

#ifdef LUMRA_PEER_LIQUID
#include <liquid/liquid.h>
#endif
#ifdef LUMRA_PEER_SOXR
#include <soxr.h>
#endif
#ifdef LUMRA_PEER_SAMPLERATE
#include <samplerate.h>
#endif

#include "bench.hpp"

namespace {

using namespace bench;

constexpr float ratio = 1.37F;  // input samples per output sample
constexpr std::size_t block = 16384;

template <class T, class R, auto run>
void resample(benchmark::State &state, std::int32_t interpolation, std::int32_t stretched) {
  constexpr std::size_t length = 32 * 64;
  lumra::host_array<T> x(block), out(0), history(0);
  const auto samples = record<T>(block);
  std::copy(samples.begin(), samples.end(), x.elements().begin());
  lumra::host_array<R> h(length), taps(0);
  for (std::size_t i = 0; i < length; ++i)
    h.elements()[i] = static_cast<R>((1 - std::cos(2 * std::numbers::pi * static_cast<double>(i) / length)) / length);
  const lumra_resampler_parameters parameters{ratio, 0, interpolation};
  std::array<unsigned char, LUMRA_RESAMPLER_STATE_SIZE> kept{};
  bool reset = true;
  float time = 0;
  for (auto _ : state) {
    lumra::check(run(x.get(), h.get(), 64, &parameters, reset, stretched, out.get(), &time, history.get(), taps.get(),
                     kept.data()));
    reset = false;
  }
  rate(state, block);
}

#ifdef LUMRA_PEER_LIQUID
/// As many taps to either side; it does not interpolate between its 64 phases.
void liquid(benchmark::State &state) {
  auto x = record<cf32>(block);
  std::vector<cf32> y(block + 64);
  resamp_crcf peer = resamp_crcf_create(1 / ratio, 16, 0.4F, 60, 64);
  unsigned int written = 0;
  for (auto _ : state) {
    resamp_crcf_execute_block(peer, x.data(), block, y.data(), &written);
    benchmark::ClobberMemory();
  }
  resamp_crcf_destroy(peer);
  rate(state, block);
}
BENCHMARK(liquid);
#endif

#ifdef LUMRA_PEER_SOXR
/// Medium quality in single precision, its best in double.
template <class T>
void soxr(benchmark::State &state) {
  const auto x = record<T>(block);
  std::vector<T> y(block + 64);
  const auto samples = is_double<T> ? SOXR_FLOAT64_I : SOXR_FLOAT32_I;
  const soxr_quality_spec_t quality = soxr_quality_spec(is_double<T> ? SOXR_VHQ : SOXR_MQ, 0);
  const soxr_io_spec_t interleaved = soxr_io_spec(samples, samples);
  const soxr_runtime_spec_t one_thread = soxr_runtime_spec(1);
  soxr_error_t error = nullptr;
  soxr_t peer = soxr_create(static_cast<double>(ratio), 1, 2, &error, &interleaved, &quality, &one_thread);
  if (error) return state.SkipWithError(error);
  for (auto _ : state) {
    std::size_t read = 0, written = 0;
    soxr_process(peer, x.data(), block, &read, y.data(), y.size(), &written);
    benchmark::ClobberMemory();
  }
  soxr_delete(peer);
  rate(state, block);
}
BENCHMARK(soxr<cf32>);
BENCHMARK(soxr<cf64>);
#endif

#ifdef LUMRA_PEER_SAMPLERATE
void libsamplerate(benchmark::State &state) {
  const auto x = record<cf32>(block);
  std::vector<cf32> y(block + 64);
  int error = 0;
  SRC_STATE *peer = src_new(SRC_SINC_FASTEST, 2, &error);
  if (!peer) return state.SkipWithError(src_strerror(error));
  SRC_DATA data{};
  data.data_in = reinterpret_cast<const float *>(x.data());
  data.data_out = reinterpret_cast<float *>(y.data());
  data.input_frames = block;
  data.output_frames = static_cast<long>(y.size());
  data.src_ratio = 1 / static_cast<double>(ratio);
  for (auto _ : state) {
    src_process(peer, &data);
    benchmark::ClobberMemory();
  }
  src_delete(peer);
  rate(state, block);
}
BENCHMARK(libsamplerate);
#endif

constexpr auto resample_s = &resample<float, float, &qsRFPELTA_sResampleC2CH>;
constexpr auto resample_d = &resample<double, double, &qsRFPELTA_dResampleC2CH>;
constexpr auto resample_c = &resample<cf32, float, &qsRFPELTA_cResampleC2CH>;
constexpr auto resample_z = &resample<cf64, double, &qsRFPELTA_zResampleC2CH>;
BENCHMARK_CAPTURE(resample_c, linear, 0, 0);
BENCHMARK_CAPTURE(resample_c, nearest, 1, 0);
BENCHMARK_CAPTURE(resample_c, stretched, 0, 1);
BENCHMARK_CAPTURE(resample_s, linear, 0, 0);
BENCHMARK_CAPTURE(resample_s, stretched, 0, 1);
BENCHMARK_CAPTURE(resample_d, linear, 0, 0);
BENCHMARK_CAPTURE(resample_z, linear, 0, 0);
BENCHMARK_CAPTURE(resample_z, stretched, 0, 1);

}  // namespace

BENCHMARK_MAIN();
