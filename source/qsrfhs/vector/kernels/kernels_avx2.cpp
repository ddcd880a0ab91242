// The kernels for processors with AVX2. SPDX-License-Identifier: MIT
#include <immintrin.h>

#include <cstddef>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "qsrfhs/vector/kernels/target.hpp"

LUMRA_BEGIN_TARGET("avx2")

namespace qsrfhs::kernels::avx2 {
namespace {
#include "lanes_avx.inl"
//
#include "one_width.inl"
//
#include "separate_products.inl"
//
#include "bodies.inl"
}  // namespace
}  // namespace qsrfhs::kernels::avx2

LUMRA_END_TARGET

namespace qsrfhs::kernels {

constexpr kernel_table avx2_kernels = avx2::table;

}  // namespace qsrfhs::kernels
