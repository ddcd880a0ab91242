// Levels of the open interface, beside reading the same memory (names: what/type/n; bytes a second).
// SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>

#include <lumra/level.h>

#include <complex>
#include <cstdint>
#include <map>
#include <numeric>
#include <random>
#include <string>
#include <vector>

namespace {

template <class T>
std::vector<T> noise(std::size_t n) {
  std::mt19937 random(1);
  std::normal_distribution<double> normal;
  std::vector<T> x(n);
  using real = decltype(std::real(T{}));
  for (T &v : x) {
    v = static_cast<real>(normal(random));
    if constexpr (sizeof(T) != sizeof(real)) v = T(v.real(), static_cast<real>(normal(random)));
  }
  return x;
}

/// Runs work(samples) over a record in the second cache and one in memory.
template <class T, class Work>
void add(const std::string &name, Work work) {
  for (const std::size_t n : {std::size_t{16384}, std::size_t{8} << 20})
    benchmark::RegisterBenchmark((name + "/" + std::to_string(n)).c_str(), [=](benchmark::State &state) {
      static std::map<std::size_t, std::vector<T>> made;
      std::vector<T> &x = made[n];
      if (x.empty()) x = noise<T>(n);
      for (auto _ : state) work(x);
      state.SetItemsProcessed(static_cast<std::int64_t>(n) * state.iterations());
      state.SetBytesProcessed(static_cast<std::int64_t>(n * sizeof(T)) * state.iterations());
    })->UseRealTime();
}

template <class T>
void add_type(const std::string &name, std::int32_t type) {
  lumra_level_options options = LUMRA_LEVEL_OPTIONS;
  options.type = type;
  for (const std::uint32_t threads : {1U, 2U}) {
    options.threads = threads;
    lumra_level *level = nullptr;
    (void)lumra_level_create(&options, &level);  // lives as long as the program
    add<T>((threads == 1 ? "level/" : "level on two threads/") + name,
           [level](const auto &x) { (void)lumra_level_add(level, x.data(), x.size()); });
  }
  // What reading the memory costs at least.
  add<T>("read/" + name, [](const auto &x) {
    const auto *words = reinterpret_cast<const std::uint64_t *>(x.data());
    benchmark::DoNotOptimize(std::accumulate(words, words + x.size() * sizeof(T) / 8, std::uint64_t{0}));
  });
}

}  // namespace

int main(int argc, char **argv) {
  add_type<float>("f32", LUMRA_TYPE_F32);
  add_type<double>("f64", LUMRA_TYPE_F64);
  add_type<std::complex<float>>("cf32", LUMRA_TYPE_CF32);
  add_type<std::complex<double>>("cf64", LUMRA_TYPE_CF64);
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
}
