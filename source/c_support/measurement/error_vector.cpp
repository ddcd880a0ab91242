// Error vectors of two matrices, in MKL's vector math, and scaling in place. SPDX-License-Identifier: MIT
#include <lumra/error_vector.h>
#include <lumra/status.h>

#include <mkl_vml.h>

#include <algorithm>
#include <limits>
#include <new>

#include "host/host_array.hpp"
#include "qsrfhs/math/mkl_runtime.hpp"
#include "qsrfhs/util/aligned_buffer.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"

namespace {

static_assert(VML_LA == LUMRA_ACCURACY_LOW && VML_HA == LUMRA_ACCURACY_HIGH &&
              VML_EP == LUMRA_ACCURACY_ENHANCED_PERFORMANCE);

/// Elements that go through all passes before the next ones: what lies between the passes stays in the first cache.
constexpr std::int32_t piece = 1024;

using sample = MKL_Complex8;

/// Rows times columns in 32 bits; negative for a matrix that cannot be.
template <class Block>
std::int32_t element_count(const Block &block) noexcept {
  if (block.rows < 0 || block.columns < 0) return -1;
  return static_cast<std::int32_t>(static_cast<std::uint32_t>(block.rows) * static_cast<std::uint32_t>(block.columns));
}

const sample *samples(lumra_cf32_matrix matrix) noexcept {
  return reinterpret_cast<const sample *>((*matrix)->elements);
}

/// Checks the arguments and calls pass(count, a, b, e, scratch) on one piece after the other.
template <class Scratch, class Pass>
std::int32_t compare(lumra_cf32_matrix a, lumra_cf32_matrix b, lumra_f32_matrix e, std::int32_t mode,
                     Pass &&pass) noexcept {
  if (!host::has_block(a) || !host::has_block(b) || !host::has_block(e)) return LUMRA_INVALID_PARAMETER;
  const std::int32_t n = element_count(**a);
  if (n < 0 || n != element_count(**b) || n != element_count(**e)) return LUMRA_INVALID_PARAMETER;
  if (mode < VML_LA || mode > VML_EP) return LUMRA_INVALID_PARAMETER;
  if (n == 0) return 0;
  try {
    const qsrfhs::aligned_buffer<Scratch> scratch(static_cast<std::size_t>(std::min(n, piece)));
    const qsrfhs::mkl_runtime::use in_use;
    for (std::int32_t first = 0; first < n;) {
      const std::int32_t count = std::min(n - first, piece);
      pass(count, samples(a) + first, samples(b) + first, (*e)->elements + first, scratch.data());
      first += count;
    }
  } catch (const std::bad_alloc &) {
    return LUMRA_ALLOCATION_FAILED;
  }
  return 0;
}

}  // namespace

int32_t qsLumraAlgo_CalculateEVM2D(lumra_cf32_matrix a, lumra_cf32_matrix b, lumra_f32_matrix e, int32_t accuracyMode) {
  return compare<sample>(a, b, e, accuracyMode,
                         [=](MKL_INT n, const sample *x, const sample *y, float *out, sample *difference) {
                           vmcSub(n, y, x, difference, accuracyMode);
                           vmcAbs(n, difference, out, accuracyMode);
                         });
}

int32_t qsLumraAlgo_CalculateMagnitudeError2D(lumra_cf32_matrix a, lumra_cf32_matrix b, lumra_f32_matrix e,
                                              int32_t accuracyMode) {
  return compare<float>(a, b, e, accuracyMode,
                        [=](MKL_INT n, const sample *x, const sample *y, float *out, float *reference) {
                          vmcAbs(n, y, out, accuracyMode);
                          vmcAbs(n, x, reference, accuracyMode);
                          vmsSub(n, out, reference, out, accuracyMode);
                        });
}

int32_t qsLumraAlgo_CalculatePhaseError2D(lumra_cf32_matrix a, lumra_cf32_matrix b, lumra_f32_matrix e,
                                          int32_t accuracyMode) {
  return compare<sample>(a, b, e, accuracyMode,
                         [=](MKL_INT n, const sample *x, const sample *y, float *out, sample *product) {
                           vmcMulByConj(n, y, x, product, accuracyMode);
                           vmcArg(n, product, out, accuracyMode);
                         });
}

int32_t qsLumraAlgo_scale_cf(lumra_cf32 *data, uint64_t n, float factor) {
  if (n == 0) return 0;
  if (!data || n > std::numeric_limits<std::size_t>::max() / sizeof *data) return LUMRA_REFUSED;
  qsrfhs::kernels::exact().scale(reinterpret_cast<float *>(data), factor, 2 * n);
  return 0;
}
