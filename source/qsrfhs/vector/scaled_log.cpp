// Scaled logarithms of host arrays. Nothing here is recorded in the error list. SPDX-License-Identifier: MIT
#include <lumra/status.h>
#include <lumra/vector_utilities.h>

#include "host/host_array.hpp"
#include "host/resize_service.hpp"
#include "qsrfhs/vector/floats.hpp"

using namespace qsrfhs;

namespace {

template <class Block>
std::int32_t write_logarithms(Block **x, lumra_f32_array *out, float a, float b,
                              void (*kernel)(const float *, float, float, float *, std::size_t)) noexcept {
  if (!out) return LUMRA_REFUSED;
  const auto result = host::size_output(out, host::elements(x).size());
  kernel(floats(host::elements(x)), a, b, floats(result), result.size());
  return 0;
}

}  // namespace

int32_t qsRFHS_log2_scaled_SGL(lumra_f32_array x, float a, float b) {
  const auto values = host::elements(x);
  kernels::exact().log2_scaled(values.data(), a, b, values.data(), values.size());
  return 0;
}

int32_t qsUtilHS_aLog2Plusb_SGL(lumra_f32_array x, lumra_f32_array *out, float a, float b) {
  return write_logarithms(x, out, a, b, kernels::exact().log2_scaled_or_infinity);
}

int32_t qsUtilHS_aLog2Plusb_IQ(lumra_cf32_array x, lumra_f32_array *out, float a, float b) {
  return write_logarithms(x, out, a, b, kernels::exact().log2_scaled_power);
}
