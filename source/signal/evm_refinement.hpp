// Delay and frequency between two streams, by least squares. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <span>

#include "signal/evm_alignment.hpp"

namespace dsp {

enum class refinement { rough, full };

/// Improves the delay and the frequency that are wanted on a part of the record, together with the gain and, where
/// wanted, the dc that fit it, by Gauss's and Newton's method: with `full` accuracy until what is left is below rounding, else
/// until a longer part can go on. Long parts leave the delay as it is: it is better known by then than noise shows.
/// Throws std::bad_alloc, dfti_failure.
template <class Sample>
alignment_outcome refine(delayed_reference<Sample> &delayed, std::span<const Sample> measured, const alignment &wanted,
                         const stretch &part, refinement how, stream_model &model);

/// The longest part on which the delay is refined.
inline constexpr std::size_t longest_for_delay = std::size_t{1} << 18;

}  // namespace dsp
