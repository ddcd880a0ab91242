// Changes of rates of the open interface beside soxr and liquid-dsp, and what a point of the transforms takes that they
// are planned with. Items are input samples; one thread, but for the rows on two. Ratios within one run count; figures
// of different runs do not compare.
// SPDX-License-Identifier: MIT

#ifdef LUMRA_PEER_LIQUID
#include <liquid/liquid.h>
#endif
#ifdef LUMRA_PEER_SOXR
#include <soxr.h>
#endif

#include "bench.hpp"

namespace {

using namespace bench;

/// Input and output rates.
constexpr struct {
  double input, output;
} rates[] = {{10e6, 3e6},   {10e6, 7.68e6}, {30.72e6, 7.68e6}, {10e6, 9.99e6},
             {10e6, 0.1e6}, {1e6, 3e6},     {44100, 48000},    {10e6, 10e6 / 1.37 + 0.1}};
constexpr std::size_t block = std::size_t{1} << 16;  // samples of a call

std::size_t room_of(double ratio) {
  return static_cast<std::size_t>(ratio * (block + 1e6)) + 16;
}

/// Arguments: row of the rates, rejection in dB, channels, threads.
template <class T>
void resample(benchmark::State &state) {
  const auto [input, output] = rates[state.range(0)];
  lumra::resampling how{.input_rate_hz = input, .output_rate_hz = output};
  how.rejection_db = static_cast<double>(state.range(1));
  how.channels = static_cast<std::uint32_t>(state.range(2));
  how.threads = static_cast<std::uint32_t>(state.range(3));
  lumra::stream_resampler<T> resampler(how);
  const auto x = record<T>(block * how.channels);
  std::vector<T> out(room_of(output / input) * how.channels);
  for (auto _ : state) benchmark::DoNotOptimize(resampler(x, out));
  rate(state, x.size());
}

#ifdef LUMRA_PEER_SOXR
/// Complex samples as two channels. Arguments: row of the rates, recipe.
void soxr(benchmark::State &state) {
  const auto [input, output] = rates[state.range(0)];
  const soxr_quality_spec_t quality = soxr_quality_spec(static_cast<unsigned long>(state.range(1)), 0);
  const soxr_io_spec_t interleaved = soxr_io_spec(SOXR_FLOAT32_I, SOXR_FLOAT32_I);
  const soxr_runtime_spec_t one_thread = soxr_runtime_spec(1);
  soxr_error_t error = nullptr;
  const soxr_t peer = soxr_create(input, output, 2, &error, &interleaved, &quality, &one_thread);
  if (error) return state.SkipWithError(error);
  const auto x = record<cf32>(block);
  std::vector<cf32> out(room_of(output / input));
  for (auto _ : state) {
    std::size_t read = 0, written = 0;
    soxr_process(peer, x.data(), block, &read, out.data(), out.size(), &written);
    check(read == block);
  }
  soxr_delete(peer);
  rate(state, block);
}
#endif

#ifdef LUMRA_PEER_LIQUID
/// Its steps by halves and a short filter between samples. Arguments: row of the rates, rejection in dB.
void liquid(benchmark::State &state) {
  const auto [input, output] = rates[state.range(0)];
  const msresamp_crcf peer =
      msresamp_crcf_create(static_cast<float>(output / input), static_cast<float>(state.range(1)));
  auto x = record<cf32>(block);
  std::vector<cf32> out(room_of(output / input));
  for (auto _ : state) {
    unsigned written = 0;
    msresamp_crcf_execute(peer, reinterpret_cast<liquid_float_complex *>(x.data()), block,
                          reinterpret_cast<liquid_float_complex *>(out.data()), &written);
    benchmark::DoNotOptimize(written);
  }
  msresamp_crcf_destroy(peer);
  rate(state, block);
}
#endif

/// A complex transform in place, forward and back. Argument: points.
void points(benchmark::State &state) {
  const auto count = static_cast<std::size_t>(state.range(0));
  std::vector<cf32> data(count);
  mkl_transform transform(count, false, true, true);
  for (auto _ : state) transform.forward(data.data());
  rate(state, count);
}

constexpr auto complex_single = &resample<cf32>;
constexpr auto complex_double = &resample<cf64>;
constexpr auto real_single = &resample<float>;
constexpr auto real_double = &resample<double>;

void register_rows() {
  for (std::int64_t row = 0; row < static_cast<std::int64_t>(std::size(rates)); ++row) {
    const auto name = [&](const char *what) {
      return std::string(what) + '/' + std::to_string(rates[row].input / 1e6) + "_to_" +
             std::to_string(rates[row].output / 1e6);
    };
    benchmark::RegisterBenchmark(name("lumra_cf32").c_str(), complex_single)
        ->Args({row, 100, 1, 1})
        ->Args({row, 120, 1, 1});
    benchmark::RegisterBenchmark(name("lumra_cf32_two_rows").c_str(), complex_single)
        ->Args({row, 100, 2, 1})
        ->Args({row, 100, 2, 2})
        ->MeasureProcessCPUTime()
        ->UseRealTime();
    benchmark::RegisterBenchmark(name("lumra_f32").c_str(), real_single)->Args({row, 100, 1, 1});
    benchmark::RegisterBenchmark(name("lumra_f64").c_str(), real_double)
        ->Args({row, 100, 1, 1})
        ->Args({row, 150, 1, 1});
    benchmark::RegisterBenchmark(name("lumra_cf64").c_str(), complex_double)
        ->Args({row, 100, 1, 1})
        ->Args({row, 150, 1, 1});
#ifdef LUMRA_PEER_SOXR
    benchmark::RegisterBenchmark(name("soxr_hq").c_str(), soxr)->Args({row, SOXR_HQ});
    benchmark::RegisterBenchmark(name("soxr_vhq").c_str(), soxr)->Args({row, SOXR_VHQ});
#endif
#ifdef LUMRA_PEER_LIQUID
    benchmark::RegisterBenchmark(name("liquid").c_str(), liquid)->Args({row, 100});
#endif
  }
  benchmark::RegisterBenchmark("points", points)
      ->RangeMultiplier(2)
      ->Range(256, 1 << 17)
      ->Args({1000})
      ->Args({2000})
      ->Args({2560})
      ->Args({3072})
      ->Args({4000})
      ->Args({5000})
      ->Args({1250})
      ->Args({675})
      ->Args({2200})
      ->Args({9984})
      ->Args({4352})
      ->Args({7992})
      ->Args({8072});
}

}  // namespace

int main(int count, char **arguments) {
  register_rows();
  benchmark::Initialize(&count, arguments);
  if (benchmark::ReportUnrecognizedArguments(count, arguments)) return 1;
  benchmark::RunSpecifiedBenchmarks();
}
