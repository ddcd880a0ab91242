// SPDX-License-Identifier: MIT
#include <lumra/window.h>

#include <cstdint>
#include <span>

#include "open/door.hpp"
#include "signal/window.hpp"

namespace doors {
namespace {

dsp::window_shape checked_shape(std::int32_t type, double parameter) {
  require(dsp::is_window(type), LUMRA_UNKNOWN_CHOICE, "type is ", type, ", which is no window; enum lumra_window_type",
          " names them");
  const bool in_range = parameter >= 0 && parameter <= dsp::largest_kaiser_beta;
  require(type != LUMRA_WINDOW_KAISER || in_range, LUMRA_OUT_OF_RANGE, "parameter is ", parameter,
          "; a Kaiser window's is 0 to ", dsp::largest_kaiser_beta);
  return {type, parameter};
}

dsp::window_span checked_span(std::int32_t span) {
  require(span == LUMRA_PERIODIC || span == LUMRA_SYMMETRIC, LUMRA_UNKNOWN_CHOICE, "span is ", span,
          "; it is LUMRA_PERIODIC or LUMRA_SYMMETRIC");
  return static_cast<dsp::window_span>(span);
}

template <class Real>
lumra_status make(const char *function, std::int32_t type, double parameter, std::int32_t span, Real *out,
                  std::uint64_t n) noexcept {
  return enter(function, [&] {
    const dsp::window_shape shape = checked_shape(type, parameter);
    const dsp::window_span extent = checked_span(span);
    dsp::make_window(shape, extent, array(out, n, "out"));
  });
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_window_make_f32(int32_t type, double parameter, int32_t span, float *out, uint64_t n) {
  return make(__func__, type, parameter, span, out, n);
}

lumra_status lumra_window_make_f64(int32_t type, double parameter, int32_t span, double *out, uint64_t n) {
  return make(__func__, type, parameter, span, out, n);
}

lumra_status lumra_window_figures(int32_t type, double parameter, int32_t span, uint64_t n,
                                  lumra_window_quality *figures) {
  return enter(__func__, [&] {
    const dsp::window_shape shape = checked_shape(type, parameter);
    const dsp::window_span extent = checked_span(span);
    constexpr std::uint64_t most = std::uint64_t{1} << 32;
    require(n >= 1 && n <= most, LUMRA_OUT_OF_RANGE, "n is ", n, "; figures are measured of 1 to 2^32 values");
    require_present(figures, "figures");
    const dsp::window_quality measured = dsp::measure_window(shape, extent, n);
    *figures = {measured.coherent_gain, measured.noise_bandwidth, measured.scalloping_loss};
  });
}

lumra_status lumra_window_by_name(const char *name, int32_t *type, double *parameter) {
  return enter(__func__, [&] {
    require_present(name, "name");
    require_present(type, "type");
    const auto found = dsp::find_window(name);
    require(found.has_value(), LUMRA_UNKNOWN_CHOICE, "name is \"", name,
            "\", which is no window; hann, flattop, blackmanharris and kaiser:8.6 are some");
    const dsp::window_shape shape = checked_shape(found->type, found->parameter);
    *type = shape.type;
    if (parameter) *parameter = shape.parameter;
  });
}
