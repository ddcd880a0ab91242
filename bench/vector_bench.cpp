// The vector utilities beside their peers and what reading and writing the same bytes takes (names: operation/who/n).
// Rates count every byte of inputs and outputs once. SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>
#include <mkl_cblas.h>

#include <immintrin.h>
#include <lumra/lumra.hpp>

#include <cmath>
#include <complex>
#include <memory>
#include <random>
#include <span>
#include <string>
#include <type_traits>
#include <vector>

#include "bench.hpp"

#ifdef LUMRA_PEER_VOLK
#include <volk/volk.h>
#endif
#ifdef LUMRA_PEER_EIGEN
#include "peer_eigen.hpp"
#endif

namespace {

using complex = std::complex<float>;
using lumra::host_array;

template <class T>
void fill(std::span<T> values) {
  std::mt19937 random(1);
  std::uniform_real_distribution<float> uniform(0.5F, 2.0F);
  for (T &value : values) {
    if constexpr (std::is_same_v<T, float>)
      value = uniform(random);
    else
      value = {uniform(random), uniform(random)};
  }
}

/// Arrays of n elements each.
struct arrays {
  explicit arrays(std::size_t n) : count(n), x(n), y(n), z(n), keys(n), real(n), table(2 * entries) {
    fill(x.elements());
    fill(y.elements());
    fill(keys.elements());
    fill(table.elements());
    for (float &key : keys.elements()) key = (key - 0.5F) / 1.5F * entries;
  }
  static constexpr std::size_t entries = 1024;

  std::size_t count;
  host_array<complex> x, y, z;
  host_array<float> keys, real;
  host_array<complex> table;
  host_array<float> coefficients{9};
};

[[gnu::target("avx")]] void stream_two(const float *x, const float *y, float *out, std::size_t n, bool bypass) {
  for (std::size_t i = 0; i < n; i += 8) {
    const __m256 sum = _mm256_add_ps(_mm256_loadu_ps(x + i), _mm256_loadu_ps(y + i));
    bypass ? _mm256_stream_ps(out + i, sum) : _mm256_storeu_ps(out + i, sum);
  }
}

/// Two floats in, one out.
[[gnu::target("avx")]] void stream_half(const float *x, float *out, std::size_t n, bool bypass) {
  for (std::size_t i = 0; i < n; i += 8) {
    const __m256 sum = _mm256_add_ps(_mm256_loadu_ps(x + 2 * i), _mm256_loadu_ps(x + 2 * i + 8));
    bypass ? _mm256_stream_ps(out + i, sum) : _mm256_storeu_ps(out + i, sum);
  }
}

[[gnu::target("avx")]] float stream_in(const float *x, std::size_t n) {
  __m256 a = _mm256_setzero_ps(), b = a, c = a, d = a;
  for (std::size_t i = 0; i < n; i += 32) {
    a = _mm256_xor_ps(a, _mm256_loadu_ps(x + i));
    b = _mm256_xor_ps(b, _mm256_loadu_ps(x + i + 8));
    c = _mm256_xor_ps(c, _mm256_loadu_ps(x + i + 16));
    d = _mm256_xor_ps(d, _mm256_loadu_ps(x + i + 24));
  }
  return _mm256_cvtss_f32(_mm256_xor_ps(_mm256_xor_ps(a, b), _mm256_xor_ps(c, d)));
}

void scalar_lookup(const arrays &a, float start, float step, complex *out) {
  const float inverse = 1 / step;
  const complex *table = a.table.elements().data(), *in = a.x.elements().data();
  const float *keys = a.keys.elements().data();
  const int last = arrays::entries - 1;
  for (std::size_t i = 0; i < a.count; ++i) {
    const float t = (keys[i] - start) * inverse;
    const int k = static_cast<int>(t);
    complex g = k < 0 ? table[0] : table[2 * last];
    if (k >= 0 && k < last) {
      const float f = t - static_cast<float>(k);
      g = {f * table[2 * k + 1].real() + table[2 * k].real(), f * table[2 * k + 1].imag() + table[2 * k].imag()};
    }
    const complex v = in[i];
    out[i] = {g.real() * v.real() - g.imag() * v.imag(), g.real() * v.imag() + g.imag() * v.real()};
  }
}

constexpr std::size_t sizes[] = {1024, 4096, 16384, 65536, 524288, std::size_t{4} << 20};

/// One benchmark for each size; work(arrays) does one pass over `width` bytes an element.
template <class Work>
void add(const std::string &name, std::size_t width, Work work) {
  for (const std::size_t n : sizes)
    benchmark::RegisterBenchmark((name + "/" + std::to_string(n)).c_str(),
                                 [=](benchmark::State &state) {
                                   arrays &a = bench::kept<arrays>(n);
                                   for (auto _ : state) {
                                     work(a);
                                     benchmark::ClobberMemory();
                                   }
                                   state.SetItemsProcessed(static_cast<std::int64_t>(n) * state.iterations());
                                   state.SetBytesProcessed(static_cast<std::int64_t>(width * n) * state.iterations());
                                 })
        ->MeasureProcessCPUTime()
        ->UseRealTime();
}

float *floats(host_array<complex> &a) {
  return reinterpret_cast<float *>(a.elements().data());
}

#ifdef LUMRA_PEER_VOLK
lv_32fc_t *volk(host_array<complex> &a) {
  return reinterpret_cast<lv_32fc_t *>(a.elements().data());
}
unsigned count(const arrays &a) {
  return static_cast<unsigned>(a.count);
}
#endif

void add_all() {
  const auto cells = [](const arrays &a) { return a.real.elements().data(); };
  const auto mutable_cells = [](arrays &a) { return a.real.elements().data(); };

  add("divide/lumra", 24, [](arrays &a) { lumra::divide(a.x, a.y, a.z); });
  add("divide/limit", 24, [](arrays &a) { stream_two(floats(a.x), floats(a.y), floats(a.z), 2 * a.count, false); });
  add("divide/limit_bypassing", 24,
      [](arrays &a) { stream_two(floats(a.x), floats(a.y), floats(a.z), 2 * a.count, true); });
  add("magnitude_squared/lumra", 12, [](arrays &a) { lumra::magnitude_squared(a.x, a.real); });
  add("magnitude/lumra", 12, [](arrays &a) { lumra::magnitude(a.x, a.real); });
  add("log_of_power/lumra", 12, [](arrays &a) { lumra::scaled_log2(a.x, a.real, 3.0103F, 0); });
  add("magnitude/limit", 12, [=](arrays &a) { stream_half(floats(a.x), mutable_cells(a), a.count, false); });
  add("magnitude/limit_bypassing", 12, [=](arrays &a) { stream_half(floats(a.x), mutable_cells(a), a.count, true); });
  add("rms/lumra", 8, [](arrays &a) {
    float rms = 0;
    qsUtilHS_RMS_IQ(a.x.get(), &rms);  // lumra::rms is the toolkit's
    benchmark::DoNotOptimize(rms);
  });
  add("rms/lumra_with_peak", 8, [](arrays &a) { benchmark::DoNotOptimize(lumra::rms_and_peak(a.x)); });
  add("rms/mkl_dot", 8, [](arrays &a) {
    const auto n = static_cast<MKL_INT>(2 * a.count);
    benchmark::DoNotOptimize(cblas_sdot(n, floats(a.x), 1, floats(a.x), 1));
  });
  add("rms/limit", 8, [](arrays &a) { benchmark::DoNotOptimize(stream_in(floats(a.x), 2 * a.count)); });
  add("polynomial/lumra", 8, [](arrays &a) { lumra::polynomial(a.keys, a.coefficients, a.real); });
  add("lookup/lumra", 20, [](arrays &a) { lumra::lookup(a.keys, a.x, a.z, a.table, 0, 1); });
  // The same work as with 4M elements in one call, in calls that stay on one thread.
  benchmark::RegisterBenchmark("lookup/lumra_in_pieces",
                               [](benchmark::State &state) {
                                 std::vector<arrays> pieces;
                                 for (int i = 0; i < 64; ++i) pieces.emplace_back(65536);
                                 for (auto _ : state)
                                   for (arrays &a : pieces) lumra::lookup(a.keys, a.x, a.z, a.table, 0, 1);
                                 bench::rate(state, 64 * 65536, 20);
                               })
      ->MeasureProcessCPUTime()
      ->UseRealTime();
  add("lookup/scalar", 20, [](arrays &a) { scalar_lookup(a, 0, 1, a.z.elements().data()); });

#ifdef LUMRA_PEER_VOLK
  add("divide/volk", 24, [](arrays &a) { volk_32fc_x2_divide_32fc(volk(a.z), volk(a.x), volk(a.y), count(a)); });
  add("magnitude_squared/volk", 12,
      [=](arrays &a) { volk_32fc_magnitude_squared_32f(mutable_cells(a), volk(a.x), count(a)); });
  add("magnitude/volk", 12, [=](arrays &a) { volk_32fc_magnitude_32f(mutable_cells(a), volk(a.x), count(a)); });
  add("log_of_power/volk", 12, [=](arrays &a) {
    volk_32fc_magnitude_squared_32f(mutable_cells(a), volk(a.x), count(a));
    volk_32f_log2_32f(mutable_cells(a), cells(a), count(a));
    volk_32f_s32f_multiply_32f(mutable_cells(a), cells(a), 3.0103F, count(a));
  });
  add("rms/volk", 8, [](arrays &a) {
    float sum = 0;
    volk_32f_x2_dot_prod_32f(&sum, floats(a.x), floats(a.x), 2 * count(a));
    benchmark::DoNotOptimize(sum);
  });
#endif
#ifdef LUMRA_PEER_EIGEN
  add("polynomial/eigen", 8, [=](arrays &a) {
    eigen_polynomial(a.keys.elements().data(), a.coefficients.elements().data(), mutable_cells(a), a.count);
  });
#endif
}

}  // namespace

int main(int argc, char **argv) {
  add_all();
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
}
