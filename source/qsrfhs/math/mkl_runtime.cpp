// SPDX-License-Identifier: MIT
#include "qsrfhs/math/mkl_runtime.hpp"

#include <mkl_service.h>

#include "qsrfhs/math/mkl_memory.hpp"

namespace qsrfhs::mkl_runtime {
namespace {

[[gnu::constructor]] void attach() noexcept {
#ifdef LUMRA_MKL_RT
  mkl_set_interface_layer(MKL_INTERFACE_LP64);
  mkl_set_threading_layer(LUMRA_MKL_RT_LAYER);
#endif
  mkl_memory::attach();
}

[[gnu::destructor]] void detach() noexcept {
  if (!mkl_section::in_use()) mkl_free_buffers();
}

}  // namespace
}  // namespace qsrfhs::mkl_runtime
