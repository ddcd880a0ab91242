// The transform that a caller keeps between calls. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

#include "signal/dfti_descriptor.hpp"
#include "toolkit/element.hpp"

namespace toolkit {

// All transforms are out of place. The spectrum of a real record is the non-negative half of the last dimension, in
// rows that are as many elements apart as those of the record.

enum class scaling { none, backward };  // backward: by one over the number of points

/// Rows and columns, or points and 0 for one dimension.
template <class E>
dsp::dfti_settings transform_settings(std::int64_t rows, std::int64_t columns, scaling scale) noexcept {
  const auto points = static_cast<double>(columns == 0 ? rows : rows * columns);
  return {.precision = is_double<E> ? DFTI_DOUBLE : DFTI_SINGLE,
          .domain = is_complex<E> ? DFTI_COMPLEX : DFTI_REAL,
          .lengths = {static_cast<MKL_LONG>(rows), static_cast<MKL_LONG>(columns)},
          .backward_scale = scale == scaling::backward ? 1.0 / points : 1.0};
}

/// Throws no_transform for more points than a transform may have.
void check_transform_size(std::int64_t points);

/// A caller's slot during one call. A failure after the transform was taken from it leaves it empty. Without a slot
/// (null) the transform lives as long as the call.
class transform_slot {
 public:
  explicit transform_slot(void **slot) noexcept : slot_(slot ? slot : &own_) {}
  transform_slot(const transform_slot &) = delete;
  transform_slot &operator=(const transform_slot &) = delete;
  ~transform_slot();

  /// The slot's transform if its settings are those, otherwise a new one in its place. Throws transform_not_freed,
  /// dsp::dfti_failure.
  const dsp::dfti_descriptor &get(const dsp::dfti_settings &wanted);
  void clear() noexcept;

 private:
  void *own_ = nullptr;
  void **slot_;
  bool taken_ = false;
};

/// Frees what the slot holds and sets it to null, whatever MKL says of it. False when MKL reports an error.
bool release(void **slot) noexcept;

}  // namespace toolkit
