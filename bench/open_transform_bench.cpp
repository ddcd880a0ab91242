// Transforms of the open interface beside MKL alone (names: type/direction/who/points). Real spectra are halves for
// both. SPDX-License-Identifier: MIT
#include <random>
#include <sstream>

#include "bench.hpp"

namespace {

enum class direction { forward, forward_in_place, backward };

struct work {
  explicit work(std::size_t points) : record(2 * points + 2), spectrum(2 * points + 2) {
    std::mt19937 random(1);
    std::normal_distribution<float> value;
    for (float &v : record) v = value(random);
    for (float &v : spectrum) v = value(random);
  }
  std::vector<float> record, spectrum;
};

/// Scaled both ways, so that transforms in place can be repeated for ever.
void mkl_alone(benchmark::State &state, bool real, std::size_t points, direction d) {
  bench::mkl_transform transform(points, false, !real, d == direction::forward_in_place,
                                 1 / std::sqrt(static_cast<double>(points)));
  work &w = bench::kept<work>(points);
  for (auto _ : state) {
    if (d == direction::forward) transform.forward(w.record.data(), w.spectrum.data());
    if (d == direction::forward_in_place) transform.forward(w.record.data());
    if (d == direction::backward) transform.backward(w.spectrum.data(), w.record.data());
    benchmark::ClobberMemory();
  }
  bench::rate(state, points);
}

void lumra_open(benchmark::State &state, bool real, std::size_t points, direction d) {
  lumra_fft_options options = LUMRA_FFT_OPTIONS;
  options.type = real ? LUMRA_TYPE_F32 : LUMRA_TYPE_CF32;
  options.points = points;
  options.scaling = LUMRA_FFT_SCALE_BOTH;
  lumra_fft *made = nullptr;
  if (lumra_fft_create(&options, &made) != LUMRA_SUCCESS) return state.SkipWithError(lumra_last_error());
  const std::unique_ptr<lumra_fft, void (*)(lumra_fft *)> fft(made, lumra_fft_free);
  work &w = bench::kept<work>(points);
  float *const to = d == direction::forward_in_place ? w.record.data() : w.spectrum.data();
  for (auto _ : state) {
    if (d == direction::backward)
      (void)lumra_fft_backward(fft.get(), w.spectrum.data(), w.record.data(), 1, nullptr);
    else
      (void)lumra_fft_forward(fft.get(), w.record.data(), to, 1, nullptr);
    benchmark::ClobberMemory();
  }
  bench::rate(state, points);
}

void add(const char *name, bool real, std::size_t points, direction d) {
  const auto title = [=](const char *who) {
    std::ostringstream text;
    text << (real ? "real/" : "complex/") << name << '/' << who << '/' << points;
    return text.str();
  };
  benchmark::RegisterBenchmark(title("lumra").c_str(), lumra_open, real, points, d);
  benchmark::RegisterBenchmark(title("mkl").c_str(), mkl_alone, real, points, d);
}

}  // namespace

int main(int argc, char **argv) {
  for (const bool real : {false, true})
    for (const std::size_t points : {16, 256, 1024, 4096, 16384, 65536, 262144, 1 << 20}) {
      add("forward", real, points, direction::forward);
      add("forward_in_place", real, points, direction::forward_in_place);
      add("backward", real, points, direction::backward);
    }
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
}
