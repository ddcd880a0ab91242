// How a measured stream lies over its reference. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <span>

#include "signal/delayed_reference.hpp"

namespace dsp {

/// measured[n] = gain reference[n - delay] exp(2 pi j frequency n) + dc; frequency in cycles per sample.
struct stream_model {
  std::complex<double> gain = 1;
  double delay = 0, frequency = 0;
  std::complex<double> dc = 0;
};

struct alignment {
  bool gain, delay, frequency, dc;
  [[nodiscard]] bool searched() const noexcept { return delay || frequency; }
};

/// Longest delay, in either direction, for records of n samples.
inline std::size_t longest_delay(std::size_t n) noexcept {
  return n / 2 < 500 ? n / 2 : 500;
}

enum class alignment_outcome { found, unrelated, undetermined };

/// Finds delay and frequency, as far as they are asked for, with whatever gain goes with them. The gain and dc of the
/// model are left for the whole record. Throws std::bad_alloc, dfti_failure.
template <class Sample>
alignment_outcome find_delay_and_frequency(std::span<const Sample> reference, std::span<const Sample> measured,
                                           const alignment &wanted, delayed_reference<Sample> &delayed,
                                           stream_model &model);

}  // namespace dsp
