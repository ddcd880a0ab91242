// Texts from files on a terminal. SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <string_view>

namespace tool {

/// The text with its control characters escaped, so that it is one line and no terminal obeys it.
std::string printable(std::string_view text);

}  // namespace tool
