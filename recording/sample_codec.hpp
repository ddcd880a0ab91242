// Conversion between samples as they lie in a file and floating point. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

#include "recording/sample_format.hpp"

namespace recording {

/// Converts out.size() components; bytes holds exactly as many. The nearest number to the component's value; double
/// precision holds each of them exactly but unsigned ones, which are thirds and the like.
void decode(const sample_format &format, std::span<const std::byte> bytes, std::span<float> out);
void decode(const sample_format &format, std::span<const std::byte> bytes, std::span<double> out);

/// Converts components, none of which is NaN, to the nearest of the type, ties to even, and those beyond its ends to
/// the ends; bytes holds exactly as many. Gives how many samples have a part that was beyond.
std::uint64_t encode(const sample_format &format, std::span<const double> in, std::span<std::byte> bytes);

/// How many samples have a part at an end of an integer type: a converter that gave them may have wanted more. None of
/// a floating-point type has.
std::uint64_t count_clipped(const sample_format &format, std::span<const std::byte> bytes);

}  // namespace recording
