// A progress bar on the terminal. SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <cstdint>
#include <string>

namespace tool {

/// Shows itself on the standard error stream when that is a terminal and the work takes longer than a moment.
class progress {
 public:
  explicit progress(std::string label);
  progress(const progress &) = delete;
  progress &operator=(const progress &) = delete;
  ~progress();

  /// Cheap enough for an inner loop over blocks; total is 0 where nobody knows the end.
  void update(std::uint64_t done, std::uint64_t total);

 private:
  using clock = std::chrono::steady_clock;

  std::string label_;
  bool terminal_;
  bool shown_ = false;
  clock::time_point start_, next_;
};

}  // namespace tool
