// Memory of zeros that takes room page by page. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <utility>

namespace platform {

/// As many bytes, all zero, of which pages are taken where they are written first. An allocator may write the zeros
/// itself, and take all of them.
class zero_pages {
 public:
  /// Throws std::bad_alloc.
  explicit zero_pages(std::size_t bytes);
  zero_pages(zero_pages &&other) noexcept
      : data_(std::exchange(other.data_, nullptr)), bytes_(std::exchange(other.bytes_, 0)) {}
  zero_pages &operator=(zero_pages &&other) noexcept {
    std::swap(data_, other.data_);
    std::swap(bytes_, other.bytes_);
    return *this;
  }
  ~zero_pages();

  [[nodiscard]] void *data() const noexcept { return data_; }

 private:
  void *data_;
  std::size_t bytes_;
};

}  // namespace platform
