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
  static constexpr std::size_t lane = 32 / sizeof(T);

  aligned_buffer() = default;
  explicit aligned_buffer(std::size_t size)
      : memory_(size == 0 ? nullptr : static_cast<T *>(::operator new(rounded(size) * sizeof(T), alignment))),
        size_(size) {}

  [[nodiscard]] T *data() const noexcept { return memory_.get(); }
  [[nodiscard]] std::size_t size() const noexcept { return size_; }
  [[nodiscard]] std::size_t capacity() const noexcept { return rounded(size_); }
  [[nodiscard]] std::span<T> elements() const noexcept { return {data(), size_}; }

 private:
  static constexpr std::align_val_t alignment{64};
  static constexpr std::size_t rounded(std::size_t size) noexcept { return (size + lane - 1) / lane * lane; }

  struct aligned_delete {
    void operator()(T *memory) const noexcept { ::operator delete(memory, alignment); }
  };

  std::unique_ptr<T, aligned_delete> memory_;
  std::size_t size_ = 0;
};

}  // namespace qsrfhs
