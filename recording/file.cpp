// SPDX-License-Identifier: MIT
#include "recording/file.hpp"

#include <cerrno>
#include <system_error>

#include "recording/failure.hpp"

namespace recording {

namespace fs = std::filesystem;

bool is_file(const fs::path &file) noexcept {
  std::error_code error;
  return fs::is_regular_file(fs::status(file, error));
}

std::uint64_t readable_size(const fs::path &file) {
  std::error_code error;
  const fs::file_status status = fs::status(file, error);
  if (!fs::exists(status)) throw failure("{}: {}", file.string(), error ? error.message() : "no such file");
  if (!fs::is_regular_file(status))
    throw failure("{}: not a regular file; save the samples to one, or give them on the standard input (-)",
                  file.string());
  const std::uint64_t size = fs::file_size(file, error);
  if (!error && ::access(file.c_str(), R_OK) != 0) error = {errno, std::generic_category()};
  if (error) throw failure("{}: {}", file.string(), error.message());
  return size;
}

}  // namespace recording
