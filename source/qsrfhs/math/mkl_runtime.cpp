// SPDX-License-Identifier: MIT
#include "qsrfhs/math/mkl_runtime.hpp"

#include <mkl_service.h>

#include <atomic>

#include "qsrfhs/math/mkl_memory.hpp"
#include "qsrfhs/math/mkl_section.hpp"

namespace qsrfhs::mkl_runtime {
namespace {

std::atomic<int> uses{0};

[[gnu::constructor]] void attach() noexcept {
#ifdef LUMRA_MKL_RT
  mkl_set_interface_layer(MKL_INTERFACE_LP64);
  mkl_set_threading_layer(LUMRA_MKL_RT_LAYER);
#endif
  mkl_memory::attach();
}

/// Unless other threads still compute.
[[gnu::destructor]] void detach() noexcept {
  if (uses.load() == 0) mkl_free_buffers();
}

}  // namespace

use::use() noexcept {
  mkl_section::set_up_thread();
  uses.fetch_add(1, std::memory_order_relaxed);
}

use::~use() {
  uses.fetch_sub(1, std::memory_order_relaxed);
}

}  // namespace qsrfhs::mkl_runtime
