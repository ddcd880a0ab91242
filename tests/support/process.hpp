// The test's own process, and children of it. SPDX-License-Identifier: MIT
#pragma once

#include <sys/wait.h>
#include <unistd.h>

#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <iterator>

namespace tests {

/// Exit status of a forked child that runs work; -1 where it crashes, or hangs for longer than any work may take. It
/// leaves at once, without the destructors of what threads of the parent use, or by `leave`.
template <class Work>
int in_child(Work &&work, void (*leave)(int) = &_exit) {
  std::fflush(nullptr);
  const pid_t child = fork();
  if (child == 0) {
    alarm(20);
    leave(work() ? 0 : 1);
  }
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

inline std::ptrdiff_t thread_count() {
  const std::filesystem::directory_iterator tasks("/proc/self/task");
  return std::distance(begin(tasks), end(tasks));
}

}  // namespace tests
