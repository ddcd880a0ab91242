// Complex division and magnitudes of host arrays. SPDX-License-Identifier: MIT
#include <lumra/status.h>
#include <lumra/vector_utilities.h>

#include "host/host_array.hpp"
#include "host/resize_service.hpp"
#include "qsrfhs/util/management.hpp"
#include "qsrfhs/vector/floats.hpp"

using namespace qsrfhs;

namespace {

std::int32_t write_magnitudes(lumra_cf32_array x, lumra_f32_array *out,
                              void (*kernel)(const float *, float *, std::size_t)) noexcept {
  const auto result = host::size_output(out, host::elements(x).size());
  kernel(floats(host::elements(x)), floats(result), result.size());
  return 0;
}

}  // namespace

int32_t qsRFHS_complex_division_array_by_array(lumra_cf32_array x, lumra_cf32_array y, lumra_cf32_array *out) {
  if (!host::has_block(x)) return Management::addError(LUMRA_DIVIDE_X_NULL);
  if (!host::has_block(y)) return Management::addError(LUMRA_DIVIDE_Y_NULL);
  if (!out) return Management::addError(LUMRA_DIVIDE_OUT_NULL);
  const std::size_t n = host::elements(x).size();
  if (n > host::elements(y).size()) return Management::addError(LUMRA_DIVIDE_Y_TOO_SHORT);
  const auto result = host::size_output(out, n);
  kernels::exact().divide(floats(host::elements(x)), floats(host::elements(y)), floats(result), result.size());
  return 0;
}

int32_t qsRFHS_complex_division_assignment_array_by_array(lumra_cf32_array x, lumra_cf32_array y) {
  if (!host::has_block(x)) return Management::addError(LUMRA_DIVIDE_IN_PLACE_X_NULL);
  if (!host::has_block(y)) return Management::addError(LUMRA_DIVIDE_IN_PLACE_Y_NULL);
  const auto result = host::elements(x);
  if (result.size() > host::elements(y).size()) return Management::addError(LUMRA_DIVIDE_IN_PLACE_Y_TOO_SHORT);
  kernels::exact().divide(floats(result), floats(host::elements(y)), floats(result), result.size());
  return 0;
}

int32_t qsRFHS_complex_division_array_by_value(lumra_cf32_array x, const lumra_cf32 *v, lumra_cf32_array *out) {
  if (!host::has_block(x)) return Management::addError(LUMRA_DIVIDE_VALUE_X_NULL);
  if (!v) return Management::addError(LUMRA_DIVIDE_VALUE_NULL);
  if (!out) return Management::addError(LUMRA_DIVIDE_VALUE_OUT_NULL);
  const float divisor[] = {v->re, v->im};  // before a resize can move it
  const auto result = host::size_output(out, host::elements(x).size());
  kernels::exact().divide_by_value(floats(host::elements(x)), divisor, floats(result), result.size());
  return 0;
}

int32_t qsRFHS_complex_division_assignment_array_by_value(lumra_cf32_array x, const lumra_cf32 *v) {
  if (!host::has_block(x)) return Management::addError(LUMRA_DIVIDE_VALUE_IN_PLACE_X_NULL);
  if (!v) return Management::addError(LUMRA_DIVIDE_VALUE_IN_PLACE_NULL);
  const auto result = host::elements(x);
  const float divisor[] = {v->re, v->im};
  kernels::exact().divide_by_value(floats(result), divisor, floats(result), result.size());
  return 0;
}

int32_t qsRFHS_complex_magnitude(lumra_cf32_array x, lumra_f32_array *out) {
  if (!host::has_block(x)) return Management::addError(LUMRA_MAGNITUDE_X_NULL);
  if (!out) return Management::addError(LUMRA_MAGNITUDE_OUT_NULL);
  return write_magnitudes(x, out, kernels::exact().magnitude);
}

int32_t qsRFHS_complex_magnitude_squared(lumra_cf32_array x, lumra_f32_array *out) {
  if (!host::has_block(x)) return Management::addError(LUMRA_MAGNITUDE_SQUARED_X_NULL);
  if (!out) return Management::addError(LUMRA_MAGNITUDE_SQUARED_OUT_NULL);
  return write_magnitudes(x, out, kernels::exact().magnitude_squared);
}
