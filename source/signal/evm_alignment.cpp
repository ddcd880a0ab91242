// SPDX-License-Identifier: MIT
#include "signal/evm_alignment.hpp"

#include <algorithm>
#include <cmath>
#include <numbers>

#include "signal/evm_refinement.hpp"
#include "signal/evm_search.hpp"

namespace dsp {

template <class Sample>
alignment_outcome find_delay_and_frequency(std::span<const Sample> reference, std::span<const Sample> measured,
                                           const alignment &wanted, delayed_reference<Sample> &delayed,
                                           stream_model &model) {
  // The noise of a frequency falls with the power 3/2 of the length: one that was refined on a part is good enough to
  // keep its phase over a part so many times as long.
  constexpr std::size_t growth = 16;
  const std::size_t n = reference.size();
  stretch part = search_stretch(reference, wanted);
  if (!search(reference, measured, wanted, part, model)) return alignment_outcome::unrelated;
  for (;;) {
    const bool last = part.count() == n;
    if (!refine(delayed, measured, wanted, part, last, model)) return alignment_outcome::undetermined;
    if (!(std::abs(model.delay) <= static_cast<double>(longest_delay(n)) + 1)) return alignment_outcome::unrelated;
    if (last) break;
    const std::size_t longer = part.count() > n / growth ? n : growth * part.count();
    const std::size_t middle = part.first + part.count() / 2;
    const std::size_t first = std::min(middle - std::min(middle, longer / 2), n - longer);
    part = {first, first + longer};
  }
  model.frequency -= std::round(model.frequency);
  return alignment_outcome::found;
}

template alignment_outcome find_delay_and_frequency(std::span<const std::complex<float>>,
                                                    std::span<const std::complex<float>>, const alignment &,
                                                    delayed_reference<std::complex<float>> &, stream_model &);
template alignment_outcome find_delay_and_frequency(std::span<const std::complex<double>>,
                                                    std::span<const std::complex<double>>, const alignment &,
                                                    delayed_reference<std::complex<double>> &, stream_model &);

}  // namespace dsp
