// What the user is told when the program fails, whatever failed. SPDX-License-Identifier: MIT
#pragma once

#include <string_view>

namespace tool {

/// From here on the first allocation by operator new that fails, wherever it is, ends the program with exit code 1 and
/// one line, written without memory; unfinished files are removed. To be called before anything that allocates.
void install_failure_report() noexcept;

/// Writes one line to the standard error stream.
void report(std::string_view text);

/// Reports the exception being handled.
void report_current_exception();

}  // namespace tool
