// Work that begins anew with every stretch of a recording. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <span>

#include "analysis/sample_blocks.hpp"
#include "analysis/selection.hpp"
#include "recording/source.hpp"

namespace tool {

/// Samples of a recording that follow each other.
struct sample_range {
  std::uint64_t first = 0, samples = 0;
};

/// Calls take with all samples in order, at most `size` at a time, and end behind each stretch. Gives how many samples
/// there were; throws failure where there are none, and what reading throws.
std::uint64_t each_stretch(const recording::source &source, const selection &chosen, std::size_t size,
                           const char *label, const std::function<void(const sample_block &)> &take,
                           const std::function<void(const sample_range &)> &end);

/// The samples of a block: float for real recordings, else complex.
template <class T>
std::span<const T> samples_of(const sample_block &block) noexcept {
  return {static_cast<const T *>(block.samples), block.count};
}

}  // namespace tool
