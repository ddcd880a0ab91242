// A first guess of delay and frequency between two streams. SPDX-License-Identifier: MIT
#pragma once

#include <span>

#include "signal/evm_alignment.hpp"

namespace dsp {

/// The part of the record on which the search goes, where the reference has the most energy.
template <class Sample>
stretch search_stretch(std::span<const Sample> reference, const alignment &wanted) noexcept;

/// Sets delay and frequency of the model from the largest correlation over all delays, all frequencies or both, to
/// a fraction of a sample and of a bin. False where there is no correlation at all. Throws std::bad_alloc,
/// dfti_failure.
template <class Sample>
bool search(std::span<const Sample> reference, std::span<const Sample> measured, const alignment &wanted,
            const stretch &part, stream_model &model);

}  // namespace dsp
