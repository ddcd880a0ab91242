// Committed MKL transforms, pooled by length. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstdint>
#include <list>
#include <map>
#include <memory>
#include <mutex>
#include <utility>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "signal/dfti_descriptor.hpp"

namespace qsrfhs {

inline constexpr std::uint64_t max_fft_length = dsp::most_fft_points;

/// One committed descriptor: complex single precision, in place, unscaled.
class fft_transform {
 public:
  /// Throws invalid_argument above max_fft_length, mkl_error when MKL refuses.
  explicit fft_transform(std::uint64_t length);
  /// A clone with a descriptor of its own.
  explicit fft_transform(const fft_transform &prototype);
  fft_transform &operator=(const fft_transform &) = delete;

  /// Throws mkl_error.
  void forward(std::complex<float> *data, const mkl_section &around);
  [[nodiscard]] std::uint64_t length() const noexcept { return length_; }

 private:
  dsp::dfti_descriptor descriptor_;
  std::uint64_t length_;
};

class fft_pool;

/// A borrowed transform, used by one thread at a time. Goes back to its pool, or is freed where that keeps no slot.
class fft_lease {
 public:
  fft_lease(std::unique_ptr<fft_transform> transform, fft_pool &pool) noexcept
      : transform_(std::move(transform)), pool_(&pool) {}
  fft_lease(const fft_lease &) = delete;
  fft_lease &operator=(const fft_lease &) = delete;
  ~fft_lease();

  fft_transform *operator->() const noexcept { return transform_.get(); }
  fft_transform &operator*() const noexcept { return *transform_; }

 private:
  friend class fft_pool;
  std::unique_ptr<fft_transform> transform_;
  fft_pool *pool_;
  mkl_runtime::use in_use_;
};

/// Idle transforms by length. A slot is a place in the pool: filled, or empty while its transform is lent out.
class fft_pool {
 public:
  /// Makes sure that there is a slot for the length; a new one is filled.
  void prefill(std::uint64_t length);
  /// An idle transform of the length, or a new one.
  [[nodiscard]] fft_lease acquire(std::uint64_t length);
  /// Frees the idle transforms and forgets the slots of those lent out.
  void clear();

  /// Slots to keep for a length that is borrowed without having been prefilled.
  void set_reserve_slots(std::int64_t count) noexcept { reserve_slots_ = count; }
  [[nodiscard]] std::int64_t idle_count() const;

  void before_fork() noexcept { mutex_.lock(); }
  void after_fork_in_parent() noexcept { mutex_.unlock(); }
  void after_fork_in_child() noexcept { mutex_.unlock(); }

 private:
  friend class fft_lease;
  using slot_list = std::list<std::unique_ptr<fft_transform>>;

  void release(fft_lease &lease) noexcept;
  void forget_empty_slot(std::uint64_t length) noexcept;

  mutable std::mutex mutex_;
  std::map<std::uint64_t, slot_list> slots_;  // under mutex_
  std::int64_t idle_count_ = 0;               // under mutex_
  std::int64_t reserve_slots_ = 0;            // set before the pool is shared
};

}  // namespace qsrfhs
