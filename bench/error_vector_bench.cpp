// Error vectors beside MKL in whole passes and VOLK (names: operation/who/n). SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>
#include <mkl_vml.h>

#include <lumra/lumra.h>

#include <algorithm>
#include <array>
#include <random>
#include <vector>

#include "bench.hpp"

#ifdef LUMRA_PEER_VOLK
#include <volk/volk.h>
#endif

namespace {

constexpr std::int32_t mode = LUMRA_ACCURACY_HIGH;

/// A host's matrix of one row.
template <class Block>
class matrix {
 public:
  explicit matrix(std::int32_t columns) {
    const std::int32_t sizes[] = {1, columns};
    qsHost_ArrayNew(sizeof(Block{}.elements[0]) == 8 ? LUMRA_TYPE_CF32 : LUMRA_TYPE_F32, 2, sizes, &handle);
  }
  matrix(const matrix &) = delete;
  matrix &operator=(const matrix &) = delete;
  ~matrix() { qsHost_ArrayFree(&handle); }

  Block **handle = nullptr;
};

struct matrices {
  explicit matrices(std::size_t count) : n(static_cast<std::int32_t>(count)), a(n), b(n), e(n), difference(count) {
    std::mt19937 random(1);
    std::normal_distribution<float> normal;
    for (auto *m : {&a, &b})
      for (std::int32_t i = 0; i < n; ++i) (*m->handle)->elements[i] = {normal(random), normal(random)};
  }
  std::int32_t n;
  matrix<lumra_cf32_matrix_block> a, b;
  matrix<lumra_f32_matrix_block> e;
  std::vector<MKL_Complex8> difference;
  [[nodiscard]] const MKL_Complex8 *x() const { return reinterpret_cast<MKL_Complex8 *>((*a.handle)->elements); }
  [[nodiscard]] const MKL_Complex8 *y() const { return reinterpret_cast<MKL_Complex8 *>((*b.handle)->elements); }
  [[nodiscard]] float *out() const { return (*e.handle)->elements; }
};

template <class Work>
void run(benchmark::State &state, Work work) {
  const auto n = static_cast<std::int32_t>(state.range(0));
  matrices &m = bench::kept<matrices>(static_cast<std::size_t>(n));
  for (auto _ : state) {
    work(m, n);
    benchmark::ClobberMemory();
  }
  state.SetItemsProcessed(n * state.iterations());
}

void evm_lumra(benchmark::State &state) {
  run(state, [](matrices &m, std::int32_t) { qsLumraAlgo_CalculateEVM2D(m.a.handle, m.b.handle, m.e.handle, mode); });
}

void evm_mkl_two_passes(benchmark::State &state) {
  run(state, [](matrices &m, std::int32_t n) {
    vmcSub(n, m.y(), m.x(), m.difference.data(), mode);
    vmcAbs(n, m.difference.data(), m.out(), mode);
  });
}

void magnitude_error_lumra(benchmark::State &state) {
  run(state, [](matrices &m, std::int32_t) {
    qsLumraAlgo_CalculateMagnitudeError2D(m.a.handle, m.b.handle, m.e.handle, mode);
  });
}

void phase_error_lumra(benchmark::State &state) {
  run(state,
      [](matrices &m, std::int32_t) { qsLumraAlgo_CalculatePhaseError2D(m.a.handle, m.b.handle, m.e.handle, mode); });
}

/// All figures of the open interface: errors' RMS and peak, magnitudes, phases.
void figures_lumra(benchmark::State &state) {
  run(state, [](matrices &m, std::int32_t n) {
    lumra_evm_result result{};
    result.size = sizeof result;
    (void)lumra_evm_measure_cf32((*m.a.handle)->elements, (*m.b.handle)->elements, static_cast<std::uint64_t>(n),
                                 nullptr, &result, nullptr, nullptr, nullptr);
    benchmark::DoNotOptimize(result.rms);
  });
}

/// The same, and the sums that an alignment by all parts of the model follows from.
void aligning_lumra(benchmark::State &state) {
  lumra_evm_meter_options options = LUMRA_EVM_METER_OPTIONS;
  options.align = LUMRA_ALIGN_GAIN | LUMRA_ALIGN_DELAY | LUMRA_ALIGN_FREQUENCY | LUMRA_ALIGN_DC;
  options.delay_samples = 0.3;
  options.frequency_hz = 1e-4;
  lumra_evm_meter *meter = nullptr;
  (void)lumra_evm_meter_create(&options, &meter);
  run(state, [meter](matrices &m, std::int32_t n) {
    (void)lumra_evm_meter_add(meter, (*m.a.handle)->elements, (*m.b.handle)->elements, static_cast<std::uint64_t>(n));
  });
  lumra_evm_meter_free(meter);
}

#ifdef LUMRA_PEER_VOLK
/// In passes over pieces that stay in the first cache.
void figures_volk(benchmark::State &state) {
  run(state, [](matrices &m, std::int32_t n) {
    constexpr unsigned piece = 512;
    alignas(64) std::array<float, 2 * piece> complex;
    alignas(64) std::array<float, piece> first, second;
    auto *const products = reinterpret_cast<lv_32fc_t *>(complex.data());
    double sums[3] = {};
    float peak = 0;
    for (std::int32_t at = 0; at < n; at += piece) {
      const auto count = std::min(piece, static_cast<unsigned>(n - at));
      const auto *const x = reinterpret_cast<const lv_32fc_t *>(m.x() + at);
      const auto *const y = reinterpret_cast<const lv_32fc_t *>(m.y() + at);
      float sum = 0;
      std::uint32_t largest = 0;
      volk_32f_x2_subtract_32f(complex.data(), reinterpret_cast<const float *>(y), reinterpret_cast<const float *>(x),
                               2 * count);
      volk_32fc_magnitude_squared_32f(first.data(), products, count);
      volk_32f_accumulator_s32f(&sum, first.data(), count);
      volk_32f_index_max_32u(&largest, first.data(), count);
      peak = std::max(peak, first[largest]);
      sums[0] += static_cast<double>(sum);
      volk_32fc_magnitude_32f(first.data(), y, count);
      volk_32fc_magnitude_32f(second.data(), x, count);
      volk_32f_x2_subtract_32f(first.data(), first.data(), second.data(), count);
      volk_32f_x2_dot_prod_32f(&sum, first.data(), first.data(), count);
      sums[1] += static_cast<double>(sum);
      volk_32fc_x2_multiply_conjugate_32fc(products, y, x, count);
      volk_32fc_s32f_atan2_32f(first.data(), products, 1, count);
      volk_32f_x2_dot_prod_32f(&sum, first.data(), first.data(), count);
      sums[2] += static_cast<double>(sum);
    }
    benchmark::DoNotOptimize(sums);
    benchmark::DoNotOptimize(peak);
  });
}
BENCHMARK(figures_volk)->Arg(16384)->Arg(1 << 20);

void evm_volk(benchmark::State &state) {
  run(state, [](matrices &m, std::int32_t n) {
    const auto count = static_cast<unsigned>(n);
    auto *difference = reinterpret_cast<float *>(m.difference.data());
    volk_32f_x2_subtract_32f(difference, &m.y()->real, &m.x()->real, 2 * count);
    volk_32fc_magnitude_32f(m.out(), reinterpret_cast<const lv_32fc_t *>(difference), count);
  });
}
BENCHMARK(evm_volk)->Arg(16384)->Arg(1 << 20);
#endif

BENCHMARK(evm_lumra)->Arg(16384)->Arg(1 << 20);
BENCHMARK(figures_lumra)->Arg(16384)->Arg(1 << 20);
BENCHMARK(aligning_lumra)->Arg(1 << 20);
BENCHMARK(evm_mkl_two_passes)->Arg(16384)->Arg(1 << 20);
BENCHMARK(magnitude_error_lumra)->Arg(16384)->Arg(1 << 20);
BENCHMARK(phase_error_lumra)->Arg(16384)->Arg(1 << 20);

}  // namespace

BENCHMARK_MAIN();
