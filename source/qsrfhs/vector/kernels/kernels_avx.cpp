// The kernels for processors with AVX. A target region behind all includes, instead of a compiler flag for the file:
// with the flag, inline functions of headers would be compiled for AVX too, and the linker might keep those copies for
// the whole library. SPDX-License-Identifier: MIT
#include <immintrin.h>

#include <cstddef>

#include "qsrfhs/vector/kernels/kernels.hpp"

#if defined(__clang__)
#pragma clang attribute push(__attribute__((target("avx"))), apply_to = function)
#else
#pragma GCC push_options
#pragma GCC target("avx")
#endif

namespace qsrfhs::kernels::avx {
namespace {
#include "lanes_avx.inl"
//
#include "bodies.inl"
}  // namespace
}  // namespace qsrfhs::kernels::avx

#if defined(__clang__)
#pragma clang attribute pop
#else
#pragma GCC pop_options
#endif

namespace qsrfhs::kernels {

constexpr kernel_table avx_kernels = avx::table;

}  // namespace qsrfhs::kernels
