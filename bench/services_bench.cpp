// Core services: FIFOs beside plain copies, recycled arrays, registered filters, and the resampler's block step beside
// its bare transforms. SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>
#include <lumra/lumra.h>
#include <mkl_dfti.h>

#include <algorithm>
#include <array>
#include <complex>
#include <cstdint>
#include <cstring>
#include <memory>
#include <thread>
#include <vector>

#include "qsrfhs/vector/fft_resampler.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"

namespace {

using sample = std::complex<float>;

struct fifo {
  std::uint64_t *cell = nullptr;
  std::uint64_t handle;
  explicit fifo(std::uint32_t capacity) : handle(qsLTEHS_DataFIFOCreate("bench", capacity, 0, &cell)) {}
  ~fifo() { qsLTEHS_DataFIFOUnreserve(&cell); }
  fifo(const fifo &) = delete;
  fifo &operator=(const fifo &) = delete;
};

constexpr std::uint32_t ring = 1 << 20;
constexpr std::size_t streamed = 64 << 20;

void repeat_until_moved(std::uint64_t handle, int direction, const void *source, void *destination, std::uint32_t n) {
  while (qsLTEHS_DataFIFO(handle, direction, source, destination, 0, n) == -1) {
  }
}

// One thread writes, one reads.
void fifo_stream(benchmark::State &state) {
  const auto piece = static_cast<std::uint32_t>(state.range(0));
  const fifo f(ring);
  for (auto _ : state) {
    std::jthread writer([&] {
      const std::vector<std::uint8_t> data(piece, 1);
      for (std::size_t sent = 0; sent < streamed; sent += piece)
        repeat_until_moved(f.handle, 0, data.data(), nullptr, piece);
    });
    std::vector<std::uint8_t> data(piece);
    for (std::size_t got = 0; got < streamed; got += piece)
      repeat_until_moved(f.handle, 1, nullptr, data.data(), piece);
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(streamed));
}

// The limit: the same bytes copied into a ring and out of it by one thread, piece by piece.
void copy_in_and_out(benchmark::State &state) {
  const auto piece = static_cast<std::size_t>(state.range(0));
  std::vector<std::uint8_t> through(ring), in(piece, 1), out(piece);
  for (auto _ : state)
    for (std::size_t moved = 0; moved < streamed; moved += ring) {
      for (std::size_t at = 0; at + piece <= ring; at += piece) std::memcpy(through.data() + at, in.data(), piece);
      for (std::size_t at = 0; at + piece <= ring; at += piece) {
        std::memcpy(out.data(), through.data() + at, piece);
        benchmark::DoNotOptimize(out.data());
        benchmark::ClobberMemory();
      }
    }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(streamed));
}

// Transfers a second when neither side waits: one thread, in and out in turn.
void fifo_transfers_of_64_bytes(benchmark::State &state) {
  const fifo f(ring);
  std::array<std::uint8_t, 64> data{};
  for (auto _ : state) {
    qsLTEHS_DataFIFO(f.handle, 0, data.data(), nullptr, 0, 64);
    qsLTEHS_DataFIFO(f.handle, 1, nullptr, data.data(), 0, 64);
  }
  state.SetItemsProcessed(2 * state.iterations());
}

void array_allocate_and_free(benchmark::State &state) {
  lumra_array_ref record{1, nullptr};
  lumra_array_ref *array = &record;
  for (auto _ : state) {
    qsUtilHS_AllocateArray_CSG(&array, 1000, 1);
    qsUtilHS_FreeArray_CSG(&array);
  }
  state.SetItemsProcessed(state.iterations());
}

lumra_filter_key key_of(int i) {
  return {LUMRA_FILTER_ROOT_RAISED_COSINE, {}, {4e6, 1e6, 0.2, 1 + i / 4.0}};
}

// `count` filters are registered; each is looked up in turn.
void filter_found_among(benchmark::State &state) {
  const int count = static_cast<int>(state.range(0));
  std::vector<lumra_filter_record> records(static_cast<std::size_t>(count));
  for (int i = 0; i < count; ++i) {
    const lumra_filter_key key = key_of(i);
    qsUtilHS_RegisterFilterSpec(&records[static_cast<std::size_t>(i)], nullptr, &key, 16);
  }
  int i = 0;
  lumra_filter_record record{};
  for (auto _ : state) {
    const lumra_filter_key key = key_of(i);
    i = (i + 7) % count;
    qsUtilHS_RegisterFilterSpec(&record, nullptr, &key, 0);
    qsUtilHS_UnegisterFilterSpec(&record);
  }
  for (int k = 0; k < count; ++k) {
    const lumra_filter_key key = key_of(k);
    qsUtilHS_MatchFilterSpecErase(&record, &key, 1);
    qsUtilHS_UnegisterFilterSpec(&records[static_cast<std::size_t>(k)]);
  }
}

constexpr std::uint32_t long_length = 65536, short_length = 4096, channel_count = 8;

struct aligned_samples {
  explicit aligned_samples(std::size_t n) : data(static_cast<sample *>(std::aligned_alloc(64, n * sizeof(sample)))) {
    std::fill_n(data, n, sample(1e-3F, -2e-3F));
  }
  ~aligned_samples() { std::free(data); }
  aligned_samples(const aligned_samples &) = delete;
  aligned_samples &operator=(const aligned_samples &) = delete;
  sample *data;
};

void resampler_block_step(benchmark::State &state) {
  lumra_resampler_descriptor *forward = nullptr, *inverse = nullptr;
  qsUtilHS_FFTResampler_CSG_CreateDescriptor(&forward, long_length, 0, 0, 1);
  qsUtilHS_FFTResampler_CSG_CreateDescriptor(&inverse, short_length, 1, 1, 1);
  const aligned_samples input(long_length), spectrum(long_length), output(channel_count * short_length);
  const std::vector<float> weights(2 * short_length, 1.F);
  std::vector<qsrfhs::resampler_channel> channels;
  for (std::uint32_t c = 0; c < channel_count; ++c)
    channels.push_back({4096 + 8192 * std::int64_t{c},
                        short_length,
                        weights.data(),
                        {output.data + c * short_length, short_length},
                        0,
                        0.1,
                        1e-3,
                        0});
  std::uint64_t block = 0;
  for (auto _ : state) {
    qsrfhs::process_block({long_length, short_length, 256}, *forward, *inverse, input.data, spectrum.data, block++,
                          false, channels);
    for (auto &channel : channels) channel.produced = 0;
  }
  qsUtilHS_FreeArrayIDH_CSG(1);
}

// The limit: one transform forward, out of place, and eight backward in place.
void mkl_transforms_alone(benchmark::State &state) {
  const auto make = [](std::uint32_t length, DFTI_CONFIG_VALUE placement) {
    DFTI_DESCRIPTOR_HANDLE transform = nullptr;
    DftiCreateDescriptor(&transform, DFTI_SINGLE, DFTI_COMPLEX, 1, static_cast<MKL_LONG>(length));
    DftiSetValue(transform, DFTI_PLACEMENT, placement);
    if (placement == DFTI_INPLACE) DftiSetValue(transform, DFTI_BACKWARD_SCALE, 1.0 / length);
    DftiCommitDescriptor(transform);
    return transform;
  };
  DFTI_DESCRIPTOR_HANDLE forward = make(long_length, DFTI_NOT_INPLACE), inverse = make(short_length, DFTI_INPLACE);
  const aligned_samples input(long_length), spectrum(long_length), bins(short_length);
  for (auto _ : state) {
    DftiComputeForward(forward, input.data, spectrum.data);
    for (std::uint32_t c = 0; c < channel_count; ++c) DftiComputeBackward(inverse, bins.data);
  }
  DftiFreeDescriptor(&forward);
  DftiFreeDescriptor(&inverse);
}

// The fastest of the repetitions: what is left when nobody else uses the machine.
double best(const std::vector<double> &times) {
  return *std::min_element(times.begin(), times.end());
}

BENCHMARK(fifo_stream)
    ->Arg(4096)
    ->Arg(64)
    ->UseRealTime()
    ->Unit(benchmark::kMillisecond)
    ->ComputeStatistics("best", best);
BENCHMARK(copy_in_and_out)
    ->Arg(4096)
    ->Arg(64)
    ->UseRealTime()
    ->Unit(benchmark::kMillisecond)
    ->ComputeStatistics("best", best);
BENCHMARK(fifo_transfers_of_64_bytes)->ComputeStatistics("best", best);
BENCHMARK(array_allocate_and_free)->Threads(1)->Threads(2)->Threads(8)->UseRealTime()->ComputeStatistics("best", best);
BENCHMARK(filter_found_among)->Arg(10)->Arg(1000)->Arg(10000)->ComputeStatistics("best", best);
BENCHMARK(resampler_block_step)->Unit(benchmark::kMicrosecond)->ComputeStatistics("best", best);
BENCHMARK(mkl_transforms_alone)->Unit(benchmark::kMicrosecond)->ComputeStatistics("best", best);

const char *chosen_kernels() {
  for (const qsrfhs::kernels::build &build : qsrfhs::kernels::builds())
    if (build.exact == &qsrfhs::kernels::exact()) return build.name;
  return "unknown";
}

}  // namespace

int main(int argc, char **argv) {
  benchmark::AddCustomContext("kernels", chosen_kernels());
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
}
