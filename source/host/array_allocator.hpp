// The library's own arrays, for hosts that have none. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <mutex>
#include <new>
#include <unordered_map>

#include "host/host_array.hpp"

namespace host {

/// Makes, resizes and frees blocks, and knows its own from foreign ones, so that a foreign block is refused instead of
/// being moved or freed. Blocks never shrink in memory. All operations may be called from any thread.
class array_allocator {
 public:
  /// One for the process, never destroyed: host threads may still free arrays while the process ends.
  static array_allocator &instance() noexcept;

  std::int32_t create(element_type type, std::int32_t dimensions, const std::int32_t *sizes, void ***handle) noexcept;
  std::int32_t resize(element_type type, std::int32_t dimensions, void ***handle, std::uint64_t count) noexcept;
  void destroy(void ***handle) noexcept;

  void before_fork() noexcept { mutex_.lock(); }
  void after_fork_in_parent() noexcept { mutex_.unlock(); }
  void after_fork_in_child() noexcept { mutex_.unlock(); }

 private:
  static constexpr std::align_val_t alignment{64};
  struct aligned_delete {
    void operator()(void *memory) const noexcept { ::operator delete(memory, alignment); }
  };
  struct allocation {
    std::unique_ptr<void, aligned_delete> memory;
    std::size_t capacity = 0;      // bytes from the block's start
    std::unique_ptr<void *> cell;  // what the handle points to, where we made that too
  };

  [[nodiscard]] std::size_t capacity_of(void *block) const;

  mutable std::mutex mutex_;
  std::unordered_map<void *, allocation> blocks_;  // by block address, under mutex_
};

}  // namespace host
