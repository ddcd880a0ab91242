// Memory that ends, or begins, at a page that faults when it is touched. SPDX-License-Identifier: MIT
#pragma once

#include <sys/mman.h>

#include <algorithm>
#include <cstddef>
#include <new>
#include <utility>
#include <vector>

namespace tests {

/// The end of the memory that touches a page of nobody's. Behind the other one lies what is left of the last page, and
/// another such page.
enum class edge { front, back };

/// `bytes` bytes, all zero.
class guarded {
 public:
  guarded(std::size_t bytes, edge at) : size_((bytes + page - 1) / page * page + 2 * page) {
    void *const all = ::mmap(nullptr, size_, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    if (all == MAP_FAILED) throw std::bad_alloc();
    start_ = static_cast<std::byte *>(all);
    data_ = at == edge::front ? start_ + page : start_ + size_ - page - bytes;
    if (bytes > 0 && ::mprotect(start_ + page, size_ - 2 * page, PROT_READ | PROT_WRITE) != 0) throw std::bad_alloc();
  }
  guarded(guarded &&other) noexcept
      : size_(other.size_), start_(std::exchange(other.start_, nullptr)), data_(other.data_) {}
  guarded &operator=(guarded &&) = delete;
  ~guarded() {
    if (start_) ::munmap(start_, size_);
  }

  /// A copy of the values.
  template <class T>
  guarded(const std::vector<T> &values, edge at) : guarded(values.size() * sizeof(T), at) {
    std::copy(values.begin(), values.end(), as<T>());
  }

  [[nodiscard]] void *data() const noexcept { return data_; }
  template <class T>
  [[nodiscard]] T *as() const noexcept {
    return reinterpret_cast<T *>(data_);
  }

 private:
  static constexpr std::size_t page = 4096;

  std::size_t size_;
  std::byte *start_ = nullptr, *data_ = nullptr;
};

}  // namespace tests
