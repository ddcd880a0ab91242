// SPDX-License-Identifier: MIT
#include "terminal/results.hpp"

#include <fmt/core.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <iterator>

#include "terminal/append.hpp"
#include "terminal/console.hpp"
#include "terminal/failure.hpp"
#include "terminal/interruption.hpp"
#include "terminal/printable.hpp"

namespace tool {

void print(std::string_view text) {
  if (std::fwrite(text.data(), 1, text.size(), stdout) != text.size() || std::fflush(stdout) != 0)
    throw failure("cannot write to the standard output: {}", system_reason(errno));
}

results::results(std::vector<std::filesystem::path> inputs) : inputs_(std::move(inputs)) {}

output_file &results::add_file(const std::filesystem::path &target) {
  return *files_.emplace_back(std::make_unique<output_file>(target, inputs_));
}

void results::add_line(std::string_view label, std::string_view text) {
  constexpr std::size_t indent = 22;
  const bool terminal = ::isatty(STDOUT_FILENO) == 1;
  const std::size_t width = terminal ? columns_of(STDOUT_FILENO) : std::string_view::npos;
  const bool styled = is_styled(STDOUT_FILENO);
  append(summary_, "{}{:<{}}{}{}\n", styled ? "\033[1m" : "", label, indent, styled ? "\033[0m" : "",
         wrapped(printable(text), width, indent));
}

void results::add_gap() {
  if (!summary_.empty()) summary_ += '\n';
}

void results::deliver() {
  bool shows_summary = true;
  for (const auto &file : files_) {
    shows_summary &= !file->is_standard_output();
    file->finish();
  }
  if (shows_summary) print(summary_);
  const output_file *refused = nullptr;
  int code = 0;
  {
    const held_signals until_all_are_there;
    for (const auto &file : files_) {
      code = file->appear(files_.size() > 1);
      if (code == 0) continue;
      refused = file.get();
      for (const auto &other : files_) other->disappear();
      break;
    }
    if (!refused)
      for (const auto &file : files_) file->stay();
  }
  if (refused) refused->fail(code);
}

}  // namespace tool
