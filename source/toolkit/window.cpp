// Sum-of-cosines windows, multiplied onto a record. SPDX-License-Identifier: MIT
#include <lumra/toolkit.h>

#include <cstdint>

#include "signal/cosine_window.hpp"
#include "toolkit/arithmetic.hpp"
#include "toolkit/frame.hpp"

namespace toolkit {
namespace {

/// Whether a window is divided by its mean.
enum class window_gain { own, one };

const dsp::cosine_sum &find_window(std::int32_t type) {
  constexpr std::int32_t last = 11;  // those behind it came later, at another door
  require(type >= 0 && type <= last && dsp::cosine_sums[type].terms != 0, bad_option);
  return dsp::cosine_sums[type];
}

template <class E>
void apply_window(output<E> &data, std::int32_t type, window_gain gain, scratch<d> room) {
  const auto values = data.values();
  const auto n = static_cast<std::int64_t>(values.size());
  require(n >= 1, empty_input);
  refuse_sharing(room, data);
  if (n == 1) return;
  const dsp::cosine_sum &window = find_window(type);
  const double divisor = gain == window_gain::one ? window.a[0] : 1.0;
  if (window.terms == 1) {
    scale(static_cast<std::int32_t>(n), static_cast<real_of<E>>(window.a[0] / divisor), values.data());
    return;
  }
  const auto tables = room.resize(static_cast<std::int64_t>(dsp::expansion_size(window)));
  dsp::expand(window, divisor, tables);
  dsp::multiply_by(window, tables.data(), values.data(), n);
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define WINDOW(E)                                                                                                   \
  int32_t qsRFPELTA_##E##AllCosWinH(handle<E> data, int32_t type, int32_t normalise, handle<d> scratch) {           \
    const window_gain gain = normalise != 0 ? window_gain::one : window_gain::own;                                  \
    return toolkit_call([&](output<E> &record) { apply_window<E>(record, type, gain, scratch); }, output<E>(data)); \
  }
WINDOW(s)
WINDOW(d)
WINDOW(c)
WINDOW(z)
#undef WINDOW
