// SPDX-License-Identifier: MIT
#include "qsrfhs/math/mkl_runtime.hpp"

#include <mkl_service.h>
#include <pthread.h>

#include <atomic>

#include "qsrfhs/math/mkl_memory.hpp"

namespace qsrfhs::mkl_runtime {
namespace {

std::atomic<int> uses{0};

// Its destructor cleans up after a thread. Unlike a thread_local's, it may be registered in vain: without memory or a
// key the thread's buffers stay until the process ends.
pthread_key_t at_thread_end;
bool has_key = false;
constinit thread_local bool known_thread = false;

[[gnu::constructor]] void attach() noexcept {
#ifdef LUMRA_MKL_RT
  mkl_set_interface_layer(MKL_INTERFACE_LP64);
  mkl_set_threading_layer(LUMRA_MKL_RT_LAYER);
#endif
  mkl_memory::attach();
  has_key = pthread_key_create(&at_thread_end, [](void *) { mkl_thread_free_buffers(); }) == 0;
}

/// Unless other threads still compute.
[[gnu::destructor]] void detach() noexcept {
  if (uses.load() == 0) mkl_free_buffers();
}

}  // namespace

use::use() noexcept {
  if (!known_thread && has_key) known_thread = pthread_setspecific(at_thread_end, &at_thread_end) == 0;
  uses.fetch_add(1, std::memory_order_relaxed);
}

use::~use() {
  uses.fetch_sub(1, std::memory_order_relaxed);
}

}  // namespace qsrfhs::mkl_runtime
