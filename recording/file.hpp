// Files that are read, and handles that close themselves. SPDX-License-Identifier: MIT
#pragma once

#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <memory>
#include <utility>

namespace recording {

/// An owned file descriptor, or -1.
class descriptor {
 public:
  explicit descriptor(int file) noexcept : file_(file) {}
  descriptor(descriptor &&other) noexcept : file_(other.release()) {}
  descriptor &operator=(descriptor &&other) noexcept {
    std::swap(file_, other.file_);
    return *this;
  }
  ~descriptor() {
    if (file_ >= 0) ::close(file_);
  }

  [[nodiscard]] int get() const noexcept { return file_; }
  [[nodiscard]] bool is_open() const noexcept { return file_ >= 0; }
  /// Gives up the ownership.
  int release() noexcept { return std::exchange(file_, -1); }

 private:
  int file_;
};

struct stream_closer {
  void operator()(std::FILE *file) const noexcept { (void)std::fclose(file); }
};
/// An owned stream of the C library.
using stream = std::unique_ptr<std::FILE, stream_closer>;

/// Whether there is a regular file of this name, as far as can be seen.
bool is_file(const std::filesystem::path &file) noexcept;

/// Size of a regular file in bytes; throws failure when there is none or it cannot be read.
std::uint64_t readable_size(const std::filesystem::path &file);

}  // namespace recording
