// A result on disk that appears whole or not at all. SPDX-License-Identifier: MIT
#pragma once

#include <fmt/format.h>

#include <cstdio>
#include <filesystem>
#include <memory>
#include <utility>
#include <vector>

#include "interruption.hpp"

namespace tool {

/// Written under a temporary name in the same folder and renamed by commit; removed otherwise. Something that is not
/// a regular file (a pipe, a terminal) is written in place.
class output_file {
 public:
  /// Throws failure, also when the file is one of those that are read.
  output_file(std::filesystem::path target, const std::vector<std::filesystem::path> &inputs);
  output_file(const output_file &) = delete;
  output_file &operator=(const output_file &) = delete;
  ~output_file();

  template <class... Args>
  void print(fmt::format_string<Args...> text, Args &&...args) {
    text_.clear();
    fmt::format_to(std::back_inserter(text_), text, std::forward<Args>(args)...);
    write(text_.data(), text_.size());
  }
  void write(const char *data, std::size_t size);
  [[nodiscard]] std::FILE *stream() const noexcept { return file_.get(); }

  /// Throws failure when anything could not be written.
  void commit();
  /// Commits two results that belong together: both appear, or neither, and then what stood in their places stays.
  void commit_with(output_file &other);

 private:
  struct closer {
    void operator()(std::FILE *file) const noexcept { (void)std::fclose(file); }
  };

  void finish();
  void take_place();

  std::filesystem::path target_;
  std::filesystem::path temporary_;  // empty: written in place, or in its place
  std::unique_ptr<unfinished_file> unfinished_;
  std::unique_ptr<std::FILE, closer> file_;
  fmt::memory_buffer text_;
};

}  // namespace tool
