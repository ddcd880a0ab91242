// The vector utilities: codes, untouched inputs, and one record of a failure. SPDX-License-Identifier: MIT
#include <lumra/core_services.h>
#include <lumra/vector_utilities.h>

#include "host_call.hpp"

namespace fuzz {
namespace {

template <class... A>
void check_call(input &in, call &on, std::int32_t (*function)(A...), std::string_view letters,
                std::initializer_list<std::int32_t> codes) {
  shared_places places;
  check_code(call_host(in, on, places, function, letters), codes);
}

/// Samples must be as many as keys, and the table must stay: what the caller owes.
void lookup(input &in, call &on) {
  auto &keys = on.give<lumra_f32_block>(reads);
  auto &x = on.give<lumra_cf32_block>(reads), &table = on.give<lumra_cf32_block>(reads);
  auto &out = on.give<lumra_cf32_block>(writes);
  if (&out == &table || (x.values.size() < keys.values.size() && x.handle && *x.handle)) return;
  auto *const to = in.one_in(16) ? nullptr : reinterpret_cast<lumra_cf32_array *>(&out.handle);
  check_code(qsUtilHS_LookupTable(keys, x, to, table, static_cast<float>(in.real()), static_cast<float>(in.real())),
             {-380127, -1});
}

void utility(input &in, call &on) {
  switch (in.choice(14)) {
    case 0:
      return check_call(in, on, qsRFHS_complex_division_array_by_array, "rrw",
                        {-83951665, -83951668, -83951671, -83951676});
    case 1:
      return check_call(in, on, qsRFHS_complex_division_assignment_array_by_array, "wr",
                        {-83951703, -83951706, -83951711});
    case 2:
      return check_call(in, on, qsRFHS_complex_division_array_by_value, "r?w", {-83951730, -83951733, -83951736});
    case 3:
      return check_call(in, on, qsRFHS_complex_division_assignment_array_by_value, "w?", {-83951766, -83951769});
    case 4:
      return check_call(in, on, qsRFHS_complex_magnitude, "rw", {-83951791, -83951794});
    case 5:
      return check_call(in, on, qsRFHS_complex_magnitude_squared, "rw", {-83951822, -83951825});
    case 6:
      return check_call(in, on, qsRFHS_ApplyPolynomial, "rrw", {});
    case 7:
      return check_call(in, on, qsRFHS_ApplyPolynomialCplx, "rrw?", {});
    case 8:
      return check_call(in, on, qsRFHS_log2_scaled_SGL, "w..", {});
    case 9:
      return check_call(in, on, qsUtilHS_aLog2Plusb_SGL, "rw..", {-1});
    case 10:
      return check_call(in, on, qsUtilHS_aLog2Plusb_IQ, "rw..", {-1});
    case 11:
      return check_call(in, on, qsUtilHS_RMS_IQ, "r?", {});
    case 12:
      return check_call(in, on, qsUtilHS_RMS_IQ_with_peak_calc, "r?.", {-1});
    default:
      return lookup(in, on);
  }
}

}  // namespace

void run(input &in) {
  hosting host(in, hosting::unit::bytes);
  for (int calls = 0; in.left() && calls < 6; ++calls) {
    call on(in, host);
    std::uint64_t before = 0, after = 0;
    qsrfhs_getErrorCnt(&before);
    utility(in, on);
    qsrfhs_getErrorCnt(&after);
    hold(after - before <= 1, "a code is recorded once");
    on.check_inputs();
  }
}

}  // namespace fuzz
