// Channels of the open interface beside their bare transforms, and beside as many resamplers on the whole stream,
// which do not even shift it. Items are samples of the stream; one thread. Ratios within one run count; figures of
// different runs do not compare. SPDX-License-Identifier: MIT
#include "bench.hpp"

namespace {

using namespace bench;

constexpr std::size_t block = std::size_t{1} << 18, count = 8;  // samples of a call, channels
constexpr double rejection = 80, stream_rate = 16e6;

/// Channels of that rate, off the bins of any transform.
std::vector<lumra::channel> channels_of(double rate) {
  std::vector<lumra::channel> channels;
  for (std::size_t k = 0; k < count; ++k) channels.push_back({-7e6 + 1.9e6 * static_cast<double>(k) + 0.1, rate});
  return channels;
}

/// Arguments: rate of the channels in Hz, threads.
void channelize(benchmark::State &state) {
  const auto rate_hz = static_cast<double>(state.range(0));
  lumra::channelizer<cf32> channelizer(stream_rate, channels_of(rate_hz), rejection,
                                       static_cast<std::uint32_t>(state.range(1)));
  const auto x = record<cf32>(block);
  std::vector<std::vector<cf32>> out(count, std::vector<cf32>(block));
  const std::vector<std::span<cf32>> rooms(out.begin(), out.end());
  for (auto _ : state) benchmark::DoNotOptimize(channelizer(x, rooms));
  rate(state, block);
}

/// The transforms of blocks as the channelizer takes them for channels of a 16th of the rate.
void bare_transforms(benchmark::State &state) {
  constexpr std::size_t points = 16384, overlap = 2048, points_out = points / 16;
  mkl_transform forward(points, false, true, true), backward(points_out, false, true, true);
  const auto wide = aligned<cf32>(points), narrow = aligned<cf32>(points_out);
  // Zeros stay what they are; values would grow from call to call.
  std::fill_n(wide.get(), points, cf32());
  std::fill_n(narrow.get(), points_out, cf32());
  for (auto _ : state) {
    forward.forward(wide.get());
    for (std::size_t k = 0; k < count; ++k) backward.forward(narrow.get());
  }
  rate(state, points - overlap);
}

/// Argument: rate of the outputs in Hz.
void separate_resamplers(benchmark::State &state) {
  lumra::resampling how{.input_rate_hz = stream_rate, .output_rate_hz = static_cast<double>(state.range(0))};
  how.rejection_db = rejection;
  std::vector<lumra::stream_resampler<cf32>> resamplers;
  for (std::size_t k = 0; k < count; ++k) resamplers.emplace_back(how);
  const auto x = record<cf32>(block);
  std::vector<cf32> out(block);
  for (auto _ : state)
    for (auto &resampler : resamplers) benchmark::DoNotOptimize(resampler(x, out));
  rate(state, block);
}

BENCHMARK(channelize)->ArgsProduct({{1000000, 1000001, 25000}, {1, 2}})->MeasureProcessCPUTime();
BENCHMARK(bare_transforms);
BENCHMARK(separate_resamplers)->Arg(1000000)->Arg(1000001)->Arg(25000);

}  // namespace

BENCHMARK_MAIN();
