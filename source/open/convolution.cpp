// SPDX-License-Identifier: MIT
#include "signal/convolution.hpp"

#include <lumra/filter.h>

#include <algorithm>
#include <cstdint>
#include <span>

#include "open/door.hpp"
#include "open/method.hpp"

namespace doors {
namespace {

dsp::convolution_part checked_part(std::uint64_t nx, std::uint64_t ny, std::int32_t mode) {
  constexpr std::uint64_t most = std::uint64_t{1} << 57;
  require(nx >= 1 && nx <= most, LUMRA_OUT_OF_RANGE, "nx is ", nx, "; a record has 1 to 2^57 elements");
  require(ny >= 1 && ny <= most, LUMRA_OUT_OF_RANGE, "ny is ", ny, "; a record has 1 to 2^57 elements");
  require(mode >= LUMRA_MODE_FULL && mode <= LUMRA_MODE_VALID, LUMRA_UNKNOWN_CHOICE, "mode is ", mode,
          ", which is no mode; enum lumra_mode names them");
  return dsp::kept_part(nx, ny, static_cast<dsp::convolution_mode>(mode));
}

/// A convolution or correlation, whichever `compute` is.
template <class T, class Tap, class Compute>
lumra_status combine(const char *function, const T *x, std::uint64_t nx, const Tap *y, std::uint64_t ny,
                     std::int32_t mode, std::int32_t method_number, T *out, std::uint64_t room,
                     Compute compute) noexcept {
  return enter(function, [&] {
    const dsp::convolution_part part = checked_part(nx, ny, mode);
    const dsp::convolution_method method = checked_method(method_number, "method");
    require(method != dsp::convolution_method::fourier || std::min(nx, ny) <= dsp::longest_in_blocks,
            LUMRA_OUT_OF_RANGE, "the shorter record has ", std::min(nx, ny),
            " elements; with LUMRA_METHOD_FOURIER it has at most 2^26");
    const auto first = array(samples(x), nx, "x");
    const auto second = array(samples(y), ny, "y");
    require(room >= part.count, LUMRA_TOO_LITTLE_ROOM, "room is ", room, "; the result has ", std::uint64_t{part.count},
            " elements");
    const auto result = array(samples(out), part.count, "out");
    require_apart(result, "out", first, "x");
    require_apart(result, "out", second, "y");
    compute(first, second, part, method, result.data());
  });
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_convolve_size(uint64_t nx, uint64_t ny, int32_t mode, uint64_t *count) {
  return enter(__func__, [&] {
    const dsp::convolution_part part = checked_part(nx, ny, mode);
    require_present(count, "count");
    *count = part.count;
  });
}

#define COMBINATION(NAME, T, TAP, COMPUTE)                                                                            \
  lumra_status lumra_##NAME(const T *x, uint64_t nx, const TAP *y, uint64_t ny, int32_t mode, int32_t method, T *out, \
                            uint64_t room) {                                                                          \
    return combine(__func__, x, nx, y, ny, mode, method, out, room, COMPUTE);                                         \
  }
COMBINATION(convolve_f32, float, float, (dsp::convolve<float, float>))
COMBINATION(convolve_f64, double, double, (dsp::convolve<double, double>))
COMBINATION(convolve_cf32, lumra_cf32, lumra_cf32, (dsp::convolve<std::complex<float>, std::complex<float>>))
COMBINATION(convolve_cf64, lumra_cf64, lumra_cf64, (dsp::convolve<std::complex<double>, std::complex<double>>))
COMBINATION(convolve_with_real_cf32, lumra_cf32, float, (dsp::convolve<std::complex<float>, float>))
COMBINATION(convolve_with_real_cf64, lumra_cf64, double, (dsp::convolve<std::complex<double>, double>))
COMBINATION(correlate_f32, float, float, dsp::correlate<float>)
COMBINATION(correlate_f64, double, double, dsp::correlate<double>)
COMBINATION(correlate_cf32, lumra_cf32, lumra_cf32, dsp::correlate<std::complex<float>>)
COMBINATION(correlate_cf64, lumra_cf64, lumra_cf64, dsp::correlate<std::complex<double>>)
#undef COMBINATION
