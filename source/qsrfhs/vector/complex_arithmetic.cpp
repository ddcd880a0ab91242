// Complex division and magnitudes of host arrays. SPDX-License-Identifier: MIT
#include <lumra/vector_utilities.h>

#include "host/host_array.hpp"
#include "host/resize_service.hpp"
#include "qsrfhs/util/management.hpp"
#include "qsrfhs/vector/floats.hpp"

using namespace qsrfhs;

namespace {

/// In the order of the checks.
enum by_array_status : std::int32_t {
  by_array_x_null = -83951665,      // 0xFAFEFFCF
  by_array_y_null = -83951668,      // 0xFAFEFFCC
  by_array_out_null = -83951671,    // 0xFAFEFFC9
  by_array_y_too_short = -83951676  // 0xFAFEFFC4
};
enum assignment_by_array_status : std::int32_t {
  assignment_by_array_x_null = -83951703,      // 0xFAFEFFA9
  assignment_by_array_y_null = -83951706,      // 0xFAFEFFA6
  assignment_by_array_y_too_short = -83951711  // 0xFAFEFFA1
};
enum by_value_status : std::int32_t {
  by_value_x_null = -83951730,   // 0xFAFEFF8E
  by_value_v_null = -83951733,   // 0xFAFEFF8B
  by_value_out_null = -83951736  // 0xFAFEFF88
};
enum assignment_by_value_status : std::int32_t {
  assignment_by_value_x_null = -83951766,  // 0xFAFEFF6A
  assignment_by_value_v_null = -83951769   // 0xFAFEFF67
};
enum magnitude_status : std::int32_t {
  magnitude_x_null = -83951791,   // 0xFAFEFF51
  magnitude_out_null = -83951794  // 0xFAFEFF4E
};
enum magnitude_squared_status : std::int32_t {
  magnitude_squared_x_null = -83951822,   // 0xFAFEFF32
  magnitude_squared_out_null = -83951825  // 0xFAFEFF2F
};

std::int32_t write_magnitudes(lumra_cf32_array x, lumra_f32_array *out,
                              void (*kernel)(const float *, float *, std::size_t)) noexcept {
  const auto result = host::size_output(out, host::elements(x).size());
  kernel(floats(host::elements(x)), floats(result), result.size());
  return 0;
}

}  // namespace

int32_t qsRFHS_complex_division_array_by_array(lumra_cf32_array x, lumra_cf32_array y, lumra_cf32_array *out) {
  if (!host::has_block(x)) return Management::addError(by_array_x_null);
  if (!host::has_block(y)) return Management::addError(by_array_y_null);
  if (!out) return Management::addError(by_array_out_null);
  const std::size_t n = host::elements(x).size();
  if (n > host::elements(y).size()) return Management::addError(by_array_y_too_short);
  const auto result = host::size_output(out, n);
  kernels::active().divide(floats(host::elements(x)), floats(host::elements(y)), floats(result), result.size());
  return 0;
}

int32_t qsRFHS_complex_division_assignment_array_by_array(lumra_cf32_array x, lumra_cf32_array y) {
  if (!host::has_block(x)) return Management::addError(assignment_by_array_x_null);
  if (!host::has_block(y)) return Management::addError(assignment_by_array_y_null);
  const auto result = host::elements(x);
  if (result.size() > host::elements(y).size()) return Management::addError(assignment_by_array_y_too_short);
  kernels::active().divide(floats(result), floats(host::elements(y)), floats(result), result.size());
  return 0;
}

int32_t qsRFHS_complex_division_array_by_value(lumra_cf32_array x, const lumra_cf32 *v, lumra_cf32_array *out) {
  if (!host::has_block(x)) return Management::addError(by_value_x_null);
  if (!v) return Management::addError(by_value_v_null);
  if (!out) return Management::addError(by_value_out_null);
  const float divisor[] = {v->re, v->im};  // before a resize can move it
  const auto result = host::size_output(out, host::elements(x).size());
  kernels::active().divide_by_value(floats(host::elements(x)), divisor, floats(result), result.size());
  return 0;
}

int32_t qsRFHS_complex_division_assignment_array_by_value(lumra_cf32_array x, const lumra_cf32 *v) {
  if (!host::has_block(x)) return Management::addError(assignment_by_value_x_null);
  if (!v) return Management::addError(assignment_by_value_v_null);
  const auto result = host::elements(x);
  const float divisor[] = {v->re, v->im};
  kernels::active().divide_by_value(floats(result), divisor, floats(result), result.size());
  return 0;
}

int32_t qsRFHS_complex_magnitude(lumra_cf32_array x, lumra_f32_array *out) {
  if (!host::has_block(x)) return Management::addError(magnitude_x_null);
  if (!out) return Management::addError(magnitude_out_null);
  return write_magnitudes(x, out, kernels::active().magnitude);
}

int32_t qsRFHS_complex_magnitude_squared(lumra_cf32_array x, lumra_f32_array *out) {
  if (!host::has_block(x)) return Management::addError(magnitude_squared_x_null);
  if (!out) return Management::addError(magnitude_squared_out_null);
  return write_magnitudes(x, out, kernels::active().magnitude_squared);
}
