// Element-wise functions of the open interface in both precisions, single precision beside the older functions on the
// same values (names: operation/who/n). SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>

#include <lumra/elementwise.h>
#include <lumra/lumra.hpp>

#include <algorithm>
#include <complex>
#include <initializer_list>
#include <random>
#include <string>
#include <vector>

#include "bench.hpp"
#ifdef LUMRA_PEER_EIGEN
#include "peer_eigen.hpp"
#endif

namespace {

/// The samples of one precision.
template <class Real, class Complex>
struct arrays {
  explicit arrays(std::size_t n) : x(n), y(n), z(n), keys(n), real(n), table(1024), coefficients(9) {
    std::mt19937 random(1);
    std::uniform_real_distribution<Real> uniform(Real(0.5), Real(2.0));
    for (auto *values : {&x, &y, &table})
      for (Complex &v : *values) v = {uniform(random), uniform(random)};
    for (Real &key : keys) key = (uniform(random) - Real(0.5)) / Real(1.5) * 1024;
    for (Real &c : coefficients) c = uniform(random);
  }
  std::vector<Complex> x, y, z;
  std::vector<Real> keys, real;
  std::vector<Complex> table;
  std::vector<Real> coefficients;
};
using single_arrays = arrays<float, lumra_cf32>;
using double_arrays = arrays<double, lumra_cf64>;

/// The same values in arrays of the older functions.
struct host_arrays {
  explicit host_arrays(std::size_t n) : x(n), y(n), z(n), keys(n), real(n), table(2048), coefficients(9) {
    const single_arrays values(n);
    for (std::size_t i = 0; i < n; ++i) {
      x.elements()[i] = {values.x[i].re, values.x[i].im};
      y.elements()[i] = {values.y[i].re, values.y[i].im};
      keys.elements()[i] = values.keys[i];
    }
    std::copy(values.coefficients.begin(), values.coefficients.end(), coefficients.elements().begin());
  }
  lumra::host_array<std::complex<float>> x, y, z;
  lumra::host_array<float> keys, real;
  lumra::host_array<std::complex<float>> table;
  lumra::host_array<float> coefficients;
};

constexpr std::size_t in_cache = 4096, in_memory = std::size_t{4} << 20;

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
