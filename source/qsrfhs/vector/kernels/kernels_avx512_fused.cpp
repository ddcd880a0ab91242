// The kernels for processors with AVX-512, with fused products. SPDX-License-Identifier: MIT
#include <immintrin.h>

#include <cstddef>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "qsrfhs/vector/kernels/target.hpp"

LUMRA_BEGIN_TARGET("avx512f,avx512bw,avx512dq,avx512vl,fma")

namespace qsrfhs::kernels::avx512_fused {
namespace {
#include "lanes_avx.inl"
//
#include "lanes_avx512.inl"
//
#include "fused_products.inl"
//
#include "fused_products_avx512.inl"
//
#include "bodies.inl"
}  // namespace
}  // namespace qsrfhs::kernels::avx512_fused

LUMRA_END_TARGET

namespace qsrfhs::kernels {

constexpr kernel_table avx512_fused_kernels = avx512_fused::table;

}  // namespace qsrfhs::kernels
