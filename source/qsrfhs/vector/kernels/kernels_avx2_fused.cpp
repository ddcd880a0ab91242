// The kernels for processors with AVX2, with fused products. SPDX-License-Identifier: MIT
#include <immintrin.h>

#include <cstddef>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "qsrfhs/vector/kernels/target.hpp"

LUMRA_BEGIN_TARGET("avx2,fma")

namespace qsrfhs::kernels::avx2_fused {
namespace {
#include "lanes_avx.inl"
//
#include "one_width.inl"
//
#include "fused_products.inl"
//
#include "bodies.inl"
}  // namespace
}  // namespace qsrfhs::kernels::avx2_fused

LUMRA_END_TARGET

namespace qsrfhs::kernels {

constexpr kernel_table avx2_fused_kernels = avx2_fused::table;

}  // namespace qsrfhs::kernels
