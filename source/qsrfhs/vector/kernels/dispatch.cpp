// SPDX-License-Identifier: MIT
#include "platform/processor.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"

namespace qsrfhs::kernels {

const kernel_table &active() noexcept {
  static const kernel_table &table = platform::has_avx() ? avx_kernels : baseline_kernels;
  return table;
}

}  // namespace qsrfhs::kernels
