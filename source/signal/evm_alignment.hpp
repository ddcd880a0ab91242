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

/// Longest delay, in either direction, that a model may have.
inline constexpr double longest_model_delay = 501;

enum class alignment_outcome { found, unrelated, undetermined };

/// How long the next part of a record may be that a model is refined on after one of n samples. A frequency's noise
/// falls with the power 3/2 of the length: even with as much noise as signal, one that was refined on n samples keeps
/// its phase to a tenth of a turn over n sqrt(n) / 4.
double longer(double n) noexcept;

/// Finds delay and frequency of records that delayed_reference takes, as far as they are asked for, with whatever gain
/// goes with them. The gain and dc of the model are left for the whole record. Throws std::bad_alloc, dfti_failure.
template <class Sample>
alignment_outcome find_delay_and_frequency(std::span<const Sample> reference, std::span<const Sample> measured,
                                           const alignment &wanted, delayed_reference<Sample> &delayed,
                                           stream_model &model);

}  // namespace dsp
