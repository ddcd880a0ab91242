// Delay and frequency between two streams, by least squares. SPDX-License-Identifier: MIT
#pragma once

#include <span>

#include "signal/evm_alignment.hpp"

namespace dsp {

/// Improves the delay and the frequency that are wanted on a part of the record, together with the gain and, where
/// wanted, the dc that fit it, by Gauss's and Newton's method: until they stand still to a hundred millionth of a sample
/// and of a turn along the part with `fully`, else to what a longer part can start from. False where the parameters
/// cannot be told from each other. Throws std::bad_alloc, dfti_failure.
template <class Sample>
bool refine(delayed_reference<Sample> &delayed, std::span<const Sample> measured, const alignment &wanted,
            const stretch &part, bool fully, stream_model &model);

}  // namespace dsp
