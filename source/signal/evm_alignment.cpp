// SPDX-License-Identifier: MIT
#include "signal/evm_alignment.hpp"

#include <algorithm>
#include <cmath>

#include "signal/evm_refinement.hpp"
#include "signal/evm_search.hpp"

namespace dsp {

double longer(double n) noexcept {
  return n * std::max(4.0, std::sqrt(n) / 8);
}

template <class Sample>
alignment_outcome find_delay_and_frequency(std::span<const Sample> reference, std::span<const Sample> measured,
                                           const alignment &wanted, delayed_reference<Sample> &delayed,
                                           stream_model &model) {
  const std::size_t n = reference.size();
  stretch part = search_stretch(reference, wanted);
  if (!search(reference, measured, wanted, part, model)) return alignment_outcome::unrelated;
  for (;;) {
    const bool last = part.count() == n;
    const alignment_outcome outcome =
        refine(delayed, measured, wanted, part, last ? refinement::full : refinement::rough, model);
    if (outcome != alignment_outcome::found) return outcome;
    if (!(std::abs(model.delay) <= static_cast<double>(longest_delay(n)) + 1)) return alignment_outcome::unrelated;
    if (last) break;
    const double grown = longer(static_cast<double>(part.count()));
    const std::size_t count = grown < static_cast<double>(n) ? static_cast<std::size_t>(grown) : n;
    const std::size_t middle = part.first + part.count() / 2;
    const std::size_t first = std::min(middle - std::min(middle, count / 2), n - count);
    part = {first, first + count};
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
