// Element-wise functions of the open interface in both precisions, single precision beside the older functions on the
// same values (names: operation/who/n). SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>

#include <lumra/elementwise.h>
#include <lumra/lumra.hpp>

#include <algorithm>
#include <complex>
#include <initializer_list>
#include <random>
#include <span>
#include <string>
#include <vector>

#include "bench.hpp"
#ifdef LUMRA_PEER_EIGEN
#include "peer_eigen.hpp"
#endif

namespace {

constexpr std::size_t in_cache = 4096, in_memory = std::size_t{4} << 20;  // elements
constexpr std::size_t gains = 1024;

template <class Real>
std::uniform_real_distribution<Real> values() {
  return std::uniform_real_distribution<Real>(Real(0.5), Real(2.0));
}

/// In arrays of the older functions.
struct host_arrays {
  explicit host_arrays(std::size_t n) : x(n), y(n), z(n), keys(n), real(n), table(2 * gains), coefficients(9) {
    std::mt19937 random(1);
    auto uniform = values<float>();
    for (auto *array : {&x, &y})
      for (auto &v : array->elements()) v = {uniform(random), uniform(random)};
    for (float &key : keys.elements()) key = (uniform(random) - 0.5F) / 1.5F * gains;
    for (float &c : coefficients.elements()) c = uniform(random);
  }
  lumra::host_array<std::complex<float>> x, y, z;
  lumra::host_array<float> keys, real;
  lumra::host_array<std::complex<float>> table;
  lumra::host_array<float> coefficients;
};

/// The same memory: where arrays lie counts more than through which function they are reached.
struct single_arrays {
  explicit single_arrays(std::size_t n) : from(bench::kept<host_arrays>(n)), table(gains, lumra_cf32{1, 1}) {}
  static std::span<lumra_cf32> plain(lumra::host_array<std::complex<float>> &array) {
    return {reinterpret_cast<lumra_cf32 *>(array.elements().data()), array.size()};
  }

  host_arrays &from;
  std::span<lumra_cf32> x = plain(from.x), y = plain(from.y), z = plain(from.z);
  std::span<float> keys = from.keys.elements(), real = from.real.elements();
  std::vector<lumra_cf32> table;
  std::span<float> coefficients = from.coefficients.elements();
};

struct double_arrays {
  explicit double_arrays(std::size_t n) : x(n), y(n), z(n), keys(n), real(n), table(gains), coefficients(9) {
    std::mt19937 random(1);
    auto uniform = values<double>();
    for (auto *array : {&x, &y, &table})
      for (lumra_cf64 &v : *array) v = {uniform(random), uniform(random)};
    for (double &key : keys) key = (uniform(random) - 0.5) / 1.5 * gains;
    for (double &c : coefficients) c = uniform(random);
  }
  std::vector<lumra_cf64> x, y, z;
  std::vector<double> keys, real;
  std::vector<lumra_cf64> table;
  std::vector<double> coefficients;
};

template <class Arrays, class Work>
void add(const std::string &name, Work work, std::initializer_list<std::size_t> lengths = {in_cache, in_memory}) {
  for (const std::size_t n : lengths)
    benchmark::RegisterBenchmark((name + "/" + std::to_string(n)).c_str(),
                                 [=](benchmark::State &state) {
                                   Arrays &a = bench::kept<Arrays>(n);
                                   for (auto _ : state) {
                                     work(a, n);
                                     benchmark::ClobberMemory();
                                   }
                                   state.SetItemsProcessed(static_cast<std::int64_t>(n) * state.iterations());
                                 })
        ->MeasureProcessCPUTime()
        ->UseRealTime();
}

/// One operation in single precision, by two threads, too, in double, and through the older function.
template <class Single, class Double, class Older>
void add_all(const std::string &name, Single single, Double twice, Older older) {
  add<single_arrays>(name + "/single", single);
  const auto by_two_threads = [=](auto &a, auto n) {
    const lumra::elementwise_threads use(2);
    single(a, n);
  };
  add<single_arrays>(name + "/single_two_threads", by_two_threads, {in_memory});
  add<double_arrays>(name + "/double", twice);
  add<host_arrays>(name + "/older", older);
}

}  // namespace

int main(int argc, char **argv) {
  add_all(
      "divide", [](auto &a, auto n) { (void)lumra_divide_cf32(a.x.data(), a.y.data(), a.z.data(), n); },
      [](auto &a, auto n) { (void)lumra_divide_cf64(a.x.data(), a.y.data(), a.z.data(), n); },
      [](auto &a, auto) { lumra::divide(a.x, a.y, a.z); });
  add_all(
      "magnitude", [](auto &a, auto n) { (void)lumra_magnitude_cf32(a.x.data(), a.real.data(), n); },
      [](auto &a, auto n) { (void)lumra_magnitude_cf64(a.x.data(), a.real.data(), n); },
      [](auto &a, auto) { lumra::magnitude(a.x, a.real); });
  add_all(
      "power", [](auto &a, auto n) { (void)lumra_power_cf32(a.x.data(), a.real.data(), n); },
      [](auto &a, auto n) { (void)lumra_power_cf64(a.x.data(), a.real.data(), n); },
      [](auto &a, auto) { lumra::magnitude_squared(a.x, a.real); });
  add_all(
      "log2_power", [](auto &a, auto n) { (void)lumra_log2_power_cf32(a.x.data(), 3.0103F, 0, a.real.data(), n); },
      [](auto &a, auto n) { (void)lumra_log2_power_cf64(a.x.data(), 3.0103, 0, a.real.data(), n); },
      [](auto &a, auto) { lumra::scaled_log2(a.x, a.real, 3.0103F, 0); });
  add_all(
      "polynomial",
      [](auto &a, auto n) { (void)lumra_polynomial_f32(a.keys.data(), a.coefficients.data(), 9, a.real.data(), n); },
      [](auto &a, auto n) { (void)lumra_polynomial_f64(a.keys.data(), a.coefficients.data(), 9, a.real.data(), n); },
      [](auto &a, auto) { lumra::polynomial(a.keys, a.coefficients, a.real); });
#ifdef LUMRA_PEER_EIGEN
  add<single_arrays>("polynomial/eigen",
                     [](auto &a, auto n) { eigen_polynomial(a.keys.data(), a.coefficients.data(), a.real.data(), n); });
#endif
  add_all(
      "lookup",
      [](auto &a, auto n) {
        (void)lumra_lookup_cf32(a.x.data(), a.keys.data(), a.table.data(), 1024, 0, 1, a.z.data(), n);
      },
      [](auto &a, auto n) {
        (void)lumra_lookup_cf64(a.x.data(), a.keys.data(), a.table.data(), 1024, 0, 1, a.z.data(), n);
      },
      [](auto &a, auto) { lumra::lookup(a.keys, a.x, a.z, a.table, 0, 1); });
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
}
