// The kernels for every 64-bit x86 processor. SPDX-License-Identifier: MIT
#include <immintrin.h>

#include <cstddef>

#include "qsrfhs/vector/kernels/kernels.hpp"

namespace qsrfhs::kernels::baseline {
namespace {
#include "lanes_baseline.inl"
//
#include "one_width.inl"
//
#include "separate_products.inl"
//
#include "bodies.inl"
}  // namespace
}  // namespace qsrfhs::kernels::baseline

namespace qsrfhs::kernels {

constexpr kernel_table baseline_kernels = baseline::table;

}  // namespace qsrfhs::kernels
