// The kernels for every 64-bit x86 processor. SPDX-License-Identifier: MIT
#include <immintrin.h>

#include <cstddef>

#include "qsrfhs/vector/kernels/kernels.hpp"

namespace qsrfhs::kernels {
namespace baseline {
namespace {
#include "lanes_baseline.inl"
//
#include "bodies.inl"
}  // namespace
}  // namespace baseline

constexpr kernel_table baseline_kernels = baseline::table;

}  // namespace qsrfhs::kernels
