// The transform that a caller keeps between calls. SPDX-License-Identifier: MIT
#pragma once

#include <mkl_dfti.h>

#include <array>
#include <cstdint>

#include "toolkit/element.hpp"
#include "toolkit/frame.hpp"

namespace toolkit {

/// All that tells one transform from another. All are out of place; the spectrum of a real one is the non-negative
/// half of the last dimension, in rows that are as many elements apart as those of the record.
struct transform_kind {
  DFTI_CONFIG_VALUE precision;
  DFTI_CONFIG_VALUE domain;
  bool backward_scaled;             // by one over the number of points; otherwise by 1
  std::array<MKL_LONG, 2> lengths;  // points and 0 for one dimension, or rows and columns

  friend bool operator==(const transform_kind &, const transform_kind &) = default;
};

enum class scaling { none, backward };

template <class E>
transform_kind vector_transform(std::int64_t length, scaling scale) noexcept {
  return {is_double<E> ? DFTI_DOUBLE : DFTI_SINGLE,
          is_complex<E> ? DFTI_COMPLEX : DFTI_REAL,
          scale == scaling::backward,
          {static_cast<MKL_LONG>(length), 0}};
}

template <class E>
transform_kind matrix_transform(std::int64_t rows, std::int64_t columns) noexcept {
  transform_kind kind = vector_transform<E>(rows, scaling::backward);
  kind.lengths[1] = static_cast<MKL_LONG>(columns);
  return kind;
}

/// Throws no_transform for more points than a transform may have.
void check_transform_size(std::int64_t points);

/// What a slot points to.
class transform {
 public:
  explicit transform(const transform_kind &kind);
  transform(const transform &) = delete;
  transform &operator=(const transform &) = delete;
  ~transform();

  /// Reads the lengths back; throws no_transform when MKL does not give them.
  [[nodiscard]] bool fits(const transform_kind &wanted) const;
  /// False when MKL reports an error; the descriptor is gone nevertheless.
  [[nodiscard]] bool free() noexcept;

  /// Throw transform_failed. Input and output are different memory.
  void forward(const void *in, void *out) const;
  void backward(const void *in, void *out) const;

 private:
  void configure() const;

  transform_kind kind_;
  DFTI_DESCRIPTOR_HANDLE descriptor_ = nullptr;
};

/// A caller's slot during one call. A failure after the transform was taken from it leaves it empty. Without a slot
/// (null) the transform lives as long as the call.
class transform_slot {
 public:
  transform_slot(void **slot) noexcept;
  transform_slot(const transform_slot &) = delete;
  transform_slot &operator=(const transform_slot &) = delete;
  ~transform_slot();

  /// The slot's transform if it is of that kind, otherwise a new one in its place. Throws no_transform,
  /// transform_not_freed.
  const transform &get(const transform_kind &kind);

 private:
  void *own_ = nullptr;
  void **slot_;
  int unwinding_;
  bool taken_ = false;
};

/// Frees what the slot holds and sets it to null, whatever MKL says of it. False when MKL reports an error.
bool release(void **slot) noexcept;

}  // namespace toolkit
