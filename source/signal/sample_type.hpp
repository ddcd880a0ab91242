// What element types of signals are. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <type_traits>

namespace dsp {

// Sample: float, double, and complex numbers of them.

/// The type of a sample's parts, and of its magnitude.
template <class Sample>
using real_of = decltype(std::real(Sample{}));
template <class Sample>
inline constexpr bool is_complex = !std::is_same_v<Sample, real_of<Sample>>;

enum class precision { single_precision, double_precision };

}  // namespace dsp
