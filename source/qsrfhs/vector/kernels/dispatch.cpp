// SPDX-License-Identifier: MIT
#include <atomic>

#include "platform/processor.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"

namespace qsrfhs::kernels {

const kernel_table &active() noexcept {
  // Not made once under a lock, in which a fork could find another thread: all find the same.
  static constinit std::atomic<const kernel_table *> chosen{nullptr};
  const kernel_table *table = chosen.load(std::memory_order_relaxed);
  if (!table) {
    table = platform::has_avx() ? &avx_kernels : &baseline_kernels;
    chosen.store(table, std::memory_order_relaxed);
  }
  return *table;
}

}  // namespace qsrfhs::kernels
