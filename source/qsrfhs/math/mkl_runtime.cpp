// SPDX-License-Identifier: MIT
#include "qsrfhs/math/mkl_runtime.hpp"

#include <mkl_service.h>

#include <atomic>

namespace qsrfhs::mkl_runtime {
namespace {

std::atomic<int> uses{0};

struct thread_cleanup {
  ~thread_cleanup() { mkl_thread_free_buffers(); }
};

}  // namespace

void attach() noexcept {
#ifdef LUMRA_MKL_RT
  mkl_set_interface_layer(MKL_INTERFACE_LP64);
  mkl_set_threading_layer(LUMRA_MKL_RT_LAYER);
#endif
}

void detach() noexcept {
  if (uses.load() == 0) mkl_free_buffers();
}

use::use() noexcept {
  thread_local const thread_cleanup cleanup;
  uses.fetch_add(1, std::memory_order_relaxed);
}

use::~use() {
  uses.fetch_sub(1, std::memory_order_relaxed);
}

}  // namespace qsrfhs::mkl_runtime
