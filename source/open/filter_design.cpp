// SPDX-License-Identifier: MIT
#include "signal/filter_design.hpp"

#include <lumra/filter.h>

#include <algorithm>
#include <cmath>
#include <cstdint>

#include "open/door.hpp"
#include "open/option_checks.hpp"
#include "qsrfhs/util/aligned_buffer.hpp"

namespace doors {
namespace {

std::uint64_t checked_length(double length) {
  require(length <= dsp::longest_design, LUMRA_OUT_OF_RANGE, "the filter would have ", length,
          " taps; at most 2^24 are designed");
  return static_cast<std::uint64_t>(length);
}

/// The number of taps is known before they are made.
struct kaiser_lowpass {
  dsp::lowpass_request request;
  double beta;
  std::uint64_t count;

  kaiser_lowpass(double sample_rate, double pass_edge, double stop_edge, double rejection) {
    require_rate(sample_rate, "sample_rate");
    request = {pass_edge / sample_rate, stop_edge / sample_rate, std::pow(10, -rejection / 20)};
    require(request.pass >= 0 && request.pass < 0.5, LUMRA_OUT_OF_RANGE, "pass_edge is ", pass_edge,
            "; it is 0 Hz or more, and below half the sample rate");
    require(request.stop > request.pass && request.stop <= 0.5, LUMRA_OUT_OF_RANGE, "stop_edge is ", stop_edge,
            "; it lies above pass_edge, and at most at half the sample rate");
    require(rejection >= 20 && rejection <= 200, LUMRA_OUT_OF_RANGE, "rejection is ", rejection,
            "; it is 20 to 200 dB");
    checked_length(dsp::kaiser_formulas(rejection).width / (request.stop - request.pass));
    const dsp::lowpass_design design = dsp::design_kaiser_lowpass(request);
    beta = design.beta;
    count = checked_length(design.length);
  }
  void make(std::span<double> taps) const { dsp::make_kaiser_lowpass(request, beta, taps); }
};

struct root_raised_cosine {
  double samples, roll_off;
  std::uint64_t count;

  root_raised_cosine(double sample_rate, double symbol_rate, double given_roll_off, double span)
      : samples(sample_rate / symbol_rate), roll_off(given_roll_off) {
    require_rate(sample_rate, "sample_rate");
    require(symbol_rate > 0 && symbol_rate <= sample_rate && std::isfinite(samples), LUMRA_OUT_OF_RANGE,
            "symbol_rate is ", symbol_rate, "; it is above 0 Hz and at most the sample rate");
    require(roll_off >= 0 && roll_off <= 1, LUMRA_OUT_OF_RANGE, "roll_off is ", roll_off, "; it is 0 to 1");
    require(span > 0 && std::isfinite(span), LUMRA_OUT_OF_RANGE, "span is ", span,
            "; it is a number of symbols above 0");
    count = checked_length(dsp::root_raised_cosine_length(samples, span));
  }
  void make(std::span<double> taps) const { dsp::make_root_raised_cosine(samples, roll_off, taps); }
};

template <class Design>
lumra_status tell_count(const char *function, double a, double b, double c, double d, std::uint64_t *count) noexcept {
  return enter(function, [&] {
    const Design design(a, b, c, d);
    require_present(count, "count");
    *count = design.count;
  });
}

template <class Design, class Real>
lumra_status make_taps(const char *function, double a, double b, double c, double d, Real *out,
                       std::uint64_t room) noexcept {
  return enter(function, [&] {
    const Design design(a, b, c, d);
    require(room >= design.count, LUMRA_TOO_LITTLE_ROOM, "room is ", room, "; the filter has ", design.count, " taps");
    const auto taps = array(out, design.count, "taps");
    const qsrfhs::aligned_buffer<double> made(taps.size());
    design.make(made.elements());
    std::transform(made.data(), made.data() + made.size(), taps.begin(), [](double h) { return static_cast<Real>(h); });
  });
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_design_kaiser_lowpass_count(double sample_rate, double pass_edge, double stop_edge, double rejection,
                                               uint64_t *count) {
  return tell_count<kaiser_lowpass>(__func__, sample_rate, pass_edge, stop_edge, rejection, count);
}

lumra_status lumra_design_kaiser_lowpass_f32(double sample_rate, double pass_edge, double stop_edge, double rejection,
                                             float *taps, uint64_t room) {
  return make_taps<kaiser_lowpass>(__func__, sample_rate, pass_edge, stop_edge, rejection, taps, room);
}

lumra_status lumra_design_kaiser_lowpass_f64(double sample_rate, double pass_edge, double stop_edge, double rejection,
                                             double *taps, uint64_t room) {
  return make_taps<kaiser_lowpass>(__func__, sample_rate, pass_edge, stop_edge, rejection, taps, room);
}

lumra_status lumra_design_root_raised_cosine_count(double sample_rate, double symbol_rate, double roll_off, double span,
                                                   uint64_t *count) {
  return tell_count<root_raised_cosine>(__func__, sample_rate, symbol_rate, roll_off, span, count);
}

lumra_status lumra_design_root_raised_cosine_f32(double sample_rate, double symbol_rate, double roll_off, double span,
                                                 float *taps, uint64_t room) {
  return make_taps<root_raised_cosine>(__func__, sample_rate, symbol_rate, roll_off, span, taps, room);
}

lumra_status lumra_design_root_raised_cosine_f64(double sample_rate, double symbol_rate, double roll_off, double span,
                                                 double *taps, uint64_t room) {
  return make_taps<root_raised_cosine>(__func__, sample_rate, symbol_rate, roll_off, span, taps, room);
}
