// Delay and frequency between two streams, by least squares. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <span>

#include "signal/evm_alignment.hpp"

namespace dsp {

enum class refinement { rough, full };

/// Improves the delay and the frequency that are wanted on a part of the record, together with the gain and, where
/// wanted, the dc that fit it, by Gauss's and Newton's method: with `full` accuracy until what is left is below
/// rounding, else until a longer part can go on. Throws std::bad_alloc, dfti_failure.
template <class Sample>
alignment_outcome refine(delayed_reference<Sample> &delayed, std::span<const Sample> measured, const alignment &wanted,
                         const stretch &part, refinement how, stream_model &model);

}  // namespace dsp
