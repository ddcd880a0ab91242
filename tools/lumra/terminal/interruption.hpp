// What is undone when a signal ends the program. SPDX-License-Identifier: MIT
//
// The handler itself removes unfinished files and ends the program by the same signal, so that an interruption takes
// effect at once, whatever is being computed.
#pragma once

#include <csignal>
#include <filesystem>

namespace tool {

/// The program calls this once, at the start. A file that grows beyond the limit for its size then fails, which is no
/// signal.
void install_interruption();

/// Removes unfinished files and ends the line of a progress bar; for an end at once, in handlers too.
void abandon_work() noexcept;

/// A file that is removed at the end of this, also when that is a signal or a lack of memory, unless it is finished.
class unfinished_file {
 public:
  explicit unfinished_file(const std::filesystem::path &file);  // throws failure
  unfinished_file(const unfinished_file &) = delete;
  unfinished_file &operator=(const unfinished_file &) = delete;
  ~unfinished_file();

  void is_finished() noexcept;

 private:
  int slot_;
};

/// The signals wait while this lives, and take effect then.
class held_signals {
 public:
  held_signals() noexcept;
  held_signals(const held_signals &) = delete;
  held_signals &operator=(const held_signals &) = delete;
  ~held_signals();

 private:
  sigset_t before_ = {};
};

/// Whether a progress bar stands on the terminal, which the handler then ends with a new line.
void set_bar_shown(bool shown) noexcept;

}  // namespace tool
