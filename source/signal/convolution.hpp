// Linear convolution and correlation of whole records. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/filter.h>

#include <cstddef>
#include <cstdint>
#include <span>

#include "signal/convolution_method.hpp"

namespace dsp {

/// Which part of the full result is kept.
enum class convolution_mode : std::int32_t { full = LUMRA_MODE_FULL, same = LUMRA_MODE_SAME, valid = LUMRA_MODE_VALID };

struct convolution_part {
  std::size_t first, count;  // of the full result
};

/// Of records with at least one element each.
[[nodiscard]] convolution_part kept_part(std::size_t nx, std::size_t ny, convolution_mode mode) noexcept;

/// The longest shorter record that transforms take.
inline constexpr std::size_t longest_in_blocks = most_fft_points / 2;

/// out[k] = sum over j of x[j] y[part.first + k - j], as many as the part has, apart from x and y. Throws
/// std::bad_alloc, dfti_failure. Taps are samples, or real.
template <class Sample, class Tap>
void convolve(std::span<const Sample> x, std::span<const Tap> y, const convolution_part &part,
              convolution_method method, Sample *out);

/// The same with y reversed and conjugated.
template <class Sample>
void correlate(std::span<const Sample> x, std::span<const Sample> y, const convolution_part &part,
               convolution_method method, Sample *out);

}  // namespace dsp
