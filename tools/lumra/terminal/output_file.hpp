// A file that appears whole or not at all. SPDX-License-Identifier: MIT
#pragma once

#include <cstdio>
#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "recording/byte_sink.hpp"
#include "recording/file.hpp"
#include "terminal/append.hpp"
#include "terminal/interruption.hpp"

namespace tool {

/// The name of the standard output as a target.
inline constexpr const char *standard_output = "-";

/// Written under a temporary name in the same folder, and removed unless it came to stay. Something that is not a
/// regular file (a pipe, a terminal) and the standard output are written in place.
class output_file final : public recording::byte_sink {
 public:
  /// Throws failure, also when the file is one of those that are read, or stands there and may not be written.
  output_file(std::filesystem::path target, const std::vector<std::filesystem::path> &inputs);

  template <class... Args>
  void print(fmt::format_string<Args...> text, Args &&...args) {
    text_.clear();
    append(text_, text, std::forward<Args>(args)...);
    write(std::as_bytes(std::span(text_)));
  }
  void write(std::span<const std::byte> bytes) override;
  /// Hands on what was written so far, for whoever reads while the work goes on.
  void flush();
  [[nodiscard]] bool is_standard_output() const noexcept { return target_ == standard_output; }
  [[nodiscard]] int descriptor() const noexcept { return ::fileno(file_.get()); }

  /// Closes the file; throws failure when not all could be written. Nothing is written afterwards.
  void finish();

  // These are for a finished file; none of them allocates, and signals are held from appear on.

  /// Takes the target's place; what stood there is kept aside if that is asked for. Gives 0, or the errno with which it
  /// changed nothing.
  int appear(bool keep_former) noexcept;
  /// Undoes appear(true), where it was successful.
  void disappear() noexcept;
  /// Gives up what was kept aside.
  void stay() noexcept;

  /// Throws the failure for an errno.
  [[noreturn]] void fail(int code) const;

 private:
  std::filesystem::path target_, temporary_, former_;
  std::optional<unfinished_file> unfinished_;  // none: written in place, or in its place
  bool appeared_ = false, replaced_ = false;
  recording::stream file_;
  std::string text_;
};

}  // namespace tool
