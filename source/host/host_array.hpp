// Host array blocks as the library sees them: element types, offsets, spans. The one place that knows the layouts.
// Algorithms and kernels receive pointers and counts, never a handle. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/host_array.h>

#include <cstddef>
#include <cstdint>
#include <span>
#include <type_traits>

namespace host {

enum class element_type : std::int32_t {
  f32 = LUMRA_TYPE_F32,
  f64 = LUMRA_TYPE_F64,
  cf32 = LUMRA_TYPE_CF32,
  cf64 = LUMRA_TYPE_CF64,
};

template <class Block>
using element_of = std::remove_extent_t<decltype(Block::elements)>;

template <class T>
inline constexpr element_type type_of = std::is_same_v<T, float>        ? element_type::f32
                                        : std::is_same_v<T, double>     ? element_type::f64
                                        : std::is_same_v<T, lumra_cf32> ? element_type::cf32
                                                                        : element_type::cf64;

/// Width of one element in bytes; 0 for a type code that does not exist.
constexpr std::size_t element_size(element_type type) noexcept {
  switch (type) {
    case element_type::f32:
      return sizeof(float);
    case element_type::f64:
      return sizeof(double);
    case element_type::cf32:
      return sizeof(lumra_cf32);
    case element_type::cf64:
      return sizeof(lumra_cf64);
  }
  return 0;
}

/// Bytes of sizes and padding in front of element 0.
constexpr std::size_t header_size(element_type type, std::int32_t dimensions) noexcept {
  const bool single = type == element_type::f32 || type == element_type::cf32;
  return dimensions == 1 && single ? 4 : 8;
}

static_assert(offsetof(lumra_f32_block, elements) == header_size(element_type::f32, 1));
static_assert(offsetof(lumra_f64_block, elements) == header_size(element_type::f64, 1));
static_assert(offsetof(lumra_cf32_block, elements) == header_size(element_type::cf32, 1));
static_assert(offsetof(lumra_cf64_block, elements) == header_size(element_type::cf64, 1));
static_assert(offsetof(lumra_f32_matrix_block, elements) == header_size(element_type::f32, 2));
static_assert(offsetof(lumra_f64_matrix_block, elements) == header_size(element_type::f64, 2));
static_assert(offsetof(lumra_cf32_matrix_block, elements) == header_size(element_type::cf32, 2));
static_assert(offsetof(lumra_cf64_matrix_block, elements) == header_size(element_type::cf64, 2));
static_assert(sizeof(lumra_cf32) == 8 && sizeof(lumra_cf64) == 16);

template <class Block>
bool has_block(Block *const *handle) noexcept {
  return handle && *handle;
}

/// The elements of a vector; empty for a null handle, a null block or a negative count.
template <class Block>
std::span<element_of<Block>> elements(Block *const *handle) noexcept {
  if (!has_block(handle) || (*handle)->count < 0) return {};
  return {(*handle)->elements, static_cast<std::size_t>((*handle)->count)};
}

}  // namespace host
