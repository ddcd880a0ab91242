// What a subcommand prints about its work. SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace tool {

/// One line of label and text on the standard output.
void summary_line(const char *label, const std::string &text);

}  // namespace tool
