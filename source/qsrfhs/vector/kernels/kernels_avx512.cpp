// The kernels for processors with AVX-512. SPDX-License-Identifier: MIT
#include <immintrin.h>

#include <cstddef>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "qsrfhs/vector/kernels/target.hpp"

LUMRA_BEGIN_TARGET("avx512f,avx512bw,avx512dq,avx512vl")

namespace qsrfhs::kernels::avx512 {
namespace {
#include "lanes_avx.inl"
//
#include "lanes_avx512.inl"
//
#include "separate_products.inl"
//
#include "bodies.inl"
}  // namespace
}  // namespace qsrfhs::kernels::avx512

LUMRA_END_TARGET

namespace qsrfhs::kernels {

constexpr kernel_table avx512_kernels = avx512::table;

}  // namespace qsrfhs::kernels
