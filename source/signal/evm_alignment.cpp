// SPDX-License-Identifier: MIT
#include "signal/evm_alignment.hpp"

#include <algorithm>
#include <cmath>

#include "signal/evm_refinement.hpp"
#include "signal/evm_search.hpp"

namespace dsp {
namespace {

/// How long the next part may be. A frequency's noise falls with the power 3/2 of the length n: even with as much noise
/// as signal, one that was refined on n samples keeps its phase to a tenth of a turn over n sqrt(n) / 4.
std::size_t longer(std::size_t count, const alignment &wanted) noexcept {
  const auto n = static_cast<double>(count);
  const std::size_t grown = static_cast<std::size_t>(n * std::max(4.0, std::sqrt(n) / 8));
  return wanted.delay && count < longest_for_delay ? std::min(grown, longest_for_delay) : grown;
}

}  // namespace

template <class Sample>
alignment_outcome find_delay_and_frequency(std::span<const Sample> reference, std::span<const Sample> measured,
                                           const alignment &wanted, delayed_reference<Sample> &delayed,
                                           stream_model &model) {
  const std::size_t n = reference.size();
  stretch part = search_stretch(reference, wanted);
  if (!search(reference, measured, wanted, part, model)) return alignment_outcome::unrelated;
  for (;;) {
    const bool last = part.count() == n || (!wanted.frequency && part.count() == longest_for_delay);
    const alignment_outcome outcome =
        refine(delayed, measured, wanted, part, last ? refinement::full : refinement::rough, model);
    if (outcome != alignment_outcome::found) return outcome;
    if (!(std::abs(model.delay) <= static_cast<double>(longest_delay(n)) + 1)) return alignment_outcome::unrelated;
    if (last) break;
    const std::size_t count = std::min(longer(part.count(), wanted), n);
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
