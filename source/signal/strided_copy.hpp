// Rows whose elements lie apart, copied to where they lie otherwise. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdlib>

namespace dsp {

/// Where rows lie, in elements: element i of row r is at r * distance + i * step.
struct row_layout {
  std::int64_t step, distance;

  /// Whether rows lie between each other's elements.
  [[nodiscard]] bool interleaved() const noexcept { return std::abs(distance) < std::abs(step); }
};

/// What a row is made of.
struct row_shape {
  std::size_t count;  // of elements
  std::size_t size;   // of an element, in bytes: 4, 8 or 16
  [[nodiscard]] std::size_t bytes() const noexcept { return count * size; }
};

/// Memory that is read and memory that is written are apart.
void copy_rows(const std::byte *in, row_layout from, std::byte *out, row_layout to, const row_shape &shape,
               std::size_t rows) noexcept;

}  // namespace dsp
