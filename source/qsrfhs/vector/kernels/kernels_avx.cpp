// The kernels for processors with AVX. SPDX-License-Identifier: MIT
#include <immintrin.h>

#include <cstddef>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "qsrfhs/vector/kernels/target.hpp"

LUMRA_BEGIN_TARGET("avx")

namespace qsrfhs::kernels::avx {
namespace {
#include "lanes_avx.inl"
//
#include "one_width.inl"
//
#include "separate_products.inl"
//
#include "bodies.inl"
}  // namespace
}  // namespace qsrfhs::kernels::avx

LUMRA_END_TARGET

namespace qsrfhs::kernels {

constexpr kernel_table avx_kernels = avx::table;

}  // namespace qsrfhs::kernels
