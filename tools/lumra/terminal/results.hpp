// What a subcommand gives: files, and a summary on the standard output. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "terminal/output_file.hpp"

namespace tool {

/// Writes to the standard output; throws failure when that cannot take it.
void print(std::string_view text);

class results {
 public:
  /// None of these files that are read may be a result.
  explicit results(std::vector<std::filesystem::path> inputs = {});

  /// Begins a file, or the standard output where its name is "-": no summary is shown then. Throws failure.
  output_file &add_file(const std::filesystem::path &target);
  /// Adds a line of label and text to the summary, as wide as the terminal.
  void add_line(std::string_view label, std::string_view text);
  /// Ends the summary of one recording, if there is one, before that of the next.
  void add_gap();

  /// Shows the summary and puts the files in their places. Throws failure when any of it cannot be: then no file has
  /// appeared, and what stood in their places stays. Allocates nothing once a file has appeared.
  void deliver();

 private:
  std::vector<std::filesystem::path> inputs_;
  std::vector<std::unique_ptr<output_file>> files_;
  std::string summary_;
};

}  // namespace tool
