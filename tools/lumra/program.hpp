// The program apart from what a process does once. SPDX-License-Identifier: MIT
#pragma once

namespace tool {

/// Reads the command line, does the work and gives the exit code: 0 done; 1 bad input or failed work; 2 wrong usage.
/// One line on the standard error stream says what failed and what to do.
int run_program(int count, const char *const *arguments);

}  // namespace tool
