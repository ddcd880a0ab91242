// Error vectors beside MKL in whole passes and VOLK (names: operation/who/n). SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>
#include <mkl_vml.h>

#include <lumra/lumra.h>

#include <random>
#include <vector>

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
  explicit matrices(std::int32_t n) : a(n), b(n), e(n), difference(static_cast<std::size_t>(n)) {
    std::mt19937 random(1);
    std::normal_distribution<float> normal;
    for (auto *m : {&a, &b})
      for (std::int32_t i = 0; i < n; ++i) (*m->handle)->elements[i] = {normal(random), normal(random)};
  }
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
  matrices m(n);
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

#ifdef LUMRA_PEER_VOLK
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
BENCHMARK(evm_mkl_two_passes)->Arg(16384)->Arg(1 << 20);
BENCHMARK(magnitude_error_lumra)->Arg(16384)->Arg(1 << 20);
BENCHMARK(phase_error_lumra)->Arg(16384)->Arg(1 << 20);

}  // namespace

BENCHMARK_MAIN();
