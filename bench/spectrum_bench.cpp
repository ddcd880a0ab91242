// The windowed FFT of 2^20 samples, flat top, 50 % overlap, one thread, beside its peers and the bare transforms; and
// what a call costs. SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>
#include <mkl_dfti.h>
#include <mkl_service.h>
#include <lumra/lumra.hpp>

#include <algorithm>
#include <barrier>
#include <cmath>
#include <complex>
#include <cstdlib>
#include <memory>
#include <new>
#include <numbers>
#include <random>
#include <thread>
#include <vector>

#if defined(LUMRA_PEER_FFTW) && defined(LUMRA_PEER_VOLK)
#include <fftw3.h>
#include <volk/volk.h>
#endif
#ifdef LUMRA_PEER_LIQUID
#include <liquid/liquid.h>
#endif

#include "bench.hpp"

namespace {

using sample = std::complex<float>;
constexpr std::size_t count = 1 << 20;

const lumra::host_array<sample> &input() {
  static const auto array = [] {
    lumra::host_array<sample> samples(count);
    std::mt19937 random(1);
    std::normal_distribution<float> value;
    for (sample &s : samples.elements()) s = {value(random), value(random)};
    return samples;
  }();
  return array;
}

[[maybe_unused]] std::vector<float> flat_top(std::size_t n) {
  std::vector<float> w(n);
  for (std::size_t k = 0; k < n; ++k) {
    const double x = 2 * std::numbers::pi * static_cast<double>(k) / static_cast<double>(n);
    w[k] = static_cast<float>(0.21557895 - 0.41663158 * std::cos(x) + 0.277263158 * std::cos(2 * x) -
                              0.083578947 * std::cos(3 * x) + 0.006947368 * std::cos(4 * x));
  }
  return w;
}

void report(benchmark::State &state, std::size_t samples) {
  state.SetItemsProcessed(state.iterations() * static_cast<std::int64_t>(samples));
}

void lumra_windowed_fft(benchmark::State &state) {
  const auto n = static_cast<std::int32_t>(state.range(0));
  lumra::session session;
  session.initialize_fft(n);
  session.initialize_window(lumra::window::flat_top, n);
  lumra::spectrum out;
  for (auto _ : state) session.power_spectrum(lumra::window::flat_top, n, 50, input(), 1e-6, out);
  report(state, count);
}

// The accumulator in a stream that goes on, as the session's memory does.
void lumra_accumulator(benchmark::State &state) {
  lumra::spectrum_average<sample> average(
      {.points = static_cast<std::uint64_t>(state.range(0)), .threads = static_cast<std::uint32_t>(state.range(1))});
  for (int i = 0; i < 4; ++i) average.add(input().elements());  // its memory and its threads are there
  for (auto _ : state) average.add(input().elements());
  report(state, count);
}

// What two threads of this machine can give at most: each has an accumulator and half of the samples of its own.
void lumra_accumulators_side_by_side(benchmark::State &state) {
  const auto accumulator = [&] {
    return lumra::spectrum_average<sample>({.points = static_cast<std::uint64_t>(state.range(0)), .threads = 1});
  };
  const auto samples = input().elements();
  auto here = accumulator(), there = accumulator();
  std::barrier both(2);
  bool ended = false;
  std::jthread other([&] {
    for (both.arrive_and_wait(); !ended; both.arrive_and_wait()) {
      there.add(samples.last(count / 2));
      both.arrive_and_wait();
    }
  });
  for (auto _ : state) {
    both.arrive_and_wait();
    here.add(samples.first(count / 2));
    both.arrive_and_wait();
  }
  ended = true;
  both.arrive_and_wait();
  report(state, count);
}

// What follows the samples: the state of a stretch saved, and one stretch joined to the one before.
void lumra_accumulator_saved(benchmark::State &state) {
  const auto n = static_cast<std::uint64_t>(state.range(0));
  lumra::spectrum_average<sample> average({.points = n, .threads = 1});
  average.add(input().elements());
  for (auto _ : state) benchmark::DoNotOptimize(average.save());
}
void lumra_accumulator_merged(benchmark::State &state) {
  const auto n = static_cast<std::uint64_t>(state.range(0));
  lumra::spectrum_average<sample> next({.points = n, .threads = 1, .start = 3 * n + 1});
  next.add(input().elements().first(3 * n + 1));
  for (auto _ : state) {
    state.PauseTiming();
    lumra::spectrum_average<sample> average({.points = n, .threads = 1});
    average.add(input().elements().first(3 * n + 1));
    state.ResumeTiming();
    average.merge(next);
  }
}

// The limit: nothing but the transforms, in place.
void mkl_transforms_alone(benchmark::State &state) {
  const auto n = static_cast<std::size_t>(state.range(0));
  const auto work = bench::aligned<sample>(n);
  std::fill_n(work.get(), n, sample(0));
  DFTI_DESCRIPTOR_HANDLE transform = nullptr;
  DftiCreateDescriptor(&transform, DFTI_SINGLE, DFTI_COMPLEX, 1, static_cast<MKL_LONG>(n));
  DftiCommitDescriptor(transform);
  const std::size_t segments = (count - n) / (n / 2) + 1;
  for (auto _ : state)
    for (std::size_t s = 0; s < segments; ++s) DftiComputeForward(transform, work.get());
  DftiFreeDescriptor(&transform);
  report(state, count);
}

#if defined(LUMRA_PEER_FFTW) && defined(LUMRA_PEER_VOLK)
void fftw_with_volk(benchmark::State &state) {
  const auto n = static_cast<unsigned>(state.range(0));
  const auto work = bench::aligned<sample>(n), spectrum = bench::aligned<sample>(n);
  const auto window = bench::aligned<float>(n), power = bench::aligned<float>(n), sum = bench::aligned<float>(n);
  const auto w = flat_top(n);
  std::copy(w.begin(), w.end(), window.get());
  const auto plan = fftwf_plan_dft_1d(static_cast<int>(n), reinterpret_cast<fftwf_complex *>(work.get()),
                                      reinterpret_cast<fftwf_complex *>(spectrum.get()), FFTW_FORWARD, FFTW_MEASURE);
  const std::size_t step = n / 2;
  const sample *x = input().elements().data();
  for (auto _ : state) {
    std::fill_n(sum.get(), n, 0.F);
    for (std::size_t start = 0; start + n <= count; start += step) {
      volk_32fc_32f_multiply_32fc(work.get(), x + start, window.get(), n);
      fftwf_execute(plan);
      volk_32fc_magnitude_squared_32f(power.get(), spectrum.get(), n);
      volk_32f_x2_add_32f(sum.get(), sum.get(), power.get(), n);
    }
    volk_32f_s32f_multiply_32f(sum.get(), sum.get(), 1.F / static_cast<float>((count - n) / step + 1), n);
    benchmark::DoNotOptimize(sum.get()[0]);
  }
  fftwf_destroy_plan(plan);
  report(state, count);
}
#endif

#ifdef LUMRA_PEER_LIQUID
void liquid_periodogram(benchmark::State &state) {
  const auto n = static_cast<unsigned>(state.range(0));
  auto *x = const_cast<sample *>(input().elements().data());
  std::vector<float> power(n);
  for (auto _ : state) {
    spgramcf periodogram = spgramcf_create(n, LIQUID_WINDOW_FLATTOP, n, n / 2);
    spgramcf_write(periodogram, reinterpret_cast<liquid_float_complex *>(x), count);
    spgramcf_get_psd(periodogram, power.data());
    spgramcf_destroy(periodogram);
  }
  report(state, count);
}
#endif

// Look-up, checks, buffers and bookkeeping: the transform of 16 points itself takes some 15 ns. The C function, as
// lumra::session asks twice before each call whether all is prepared. In a process that has had a second thread, as hosts
// have: as long as there was none, the C library locks without locked instructions, which takes half as long.
void lumra_call_of_16_samples(benchmark::State &state) {
  std::jthread([] {}).join();
  lumra::session session;
  session.initialize_fft(16);
  session.initialize_window(lumra::window::flat_top, 16);
  const lumra::host_array<sample> samples(16);
  lumra::host_array<float> power(16);
  const lumra_waveform waveform{0, 1e-6, samples.get()};
  lumra_spectrum out{0, 0, power.get()};
  for (auto _ : state) {
    const std::int32_t code = qsLumraAlgo_PerformWindowingOverlappedSeqFFTAndIQTransform(
        session.get(), static_cast<std::int32_t>(lumra::window::flat_top), 16, 0, &waveform, &out);
    if (code != 0) state.SkipWithError("refused");
  }
  *power.address() = out.y;
}

// The fastest of the repetitions: what is left when nobody else uses the machine.
double best(const std::vector<double> &times) {
  return *std::min_element(times.begin(), times.end());
}

#define SIZES                         \
  ->Arg(256)                          \
      ->Arg(1024)                     \
      ->Arg(4096)                     \
      ->Arg(16384)                    \
      ->Arg(65536)                    \
      ->Arg(262144)                   \
      ->Unit(benchmark::kMicrosecond) \
      ->ComputeStatistics("best", best)
BENCHMARK(lumra_windowed_fft) SIZES;
BENCHMARK(lumra_accumulator)
    ->ArgsProduct({{256, 1024, 4096, 16384, 65536, 262144}, {1, 2}})
    ->Unit(benchmark::kMicrosecond)
    ->MeasureProcessCPUTime()
    ->UseRealTime()
    ->ComputeStatistics("best", best);
BENCHMARK(lumra_accumulators_side_by_side) SIZES->UseRealTime();
BENCHMARK(lumra_accumulator_saved)->Arg(1024)->Arg(4096);
BENCHMARK(lumra_accumulator_merged)->Arg(1024)->Arg(4096);
BENCHMARK(mkl_transforms_alone) SIZES;
#if defined(LUMRA_PEER_FFTW) && defined(LUMRA_PEER_VOLK)
BENCHMARK(fftw_with_volk) SIZES;
#endif
#ifdef LUMRA_PEER_LIQUID
BENCHMARK(liquid_periodogram) SIZES;
#endif
BENCHMARK(lumra_call_of_16_samples)->ComputeStatistics("best", best);

}  // namespace

BENCHMARK_MAIN();
