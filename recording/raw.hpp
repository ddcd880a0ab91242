// Bytes that are samples and nothing else. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>

#include "recording/options.hpp"
#include "recording/source.hpp"

namespace recording {

/// The sample type comes from the options, or else from the suffix. Throws failure.
source open_raw(const std::filesystem::path &path, const options &said);

/// The standard input, of any length. Throws failure.
source open_standard_input(const options &said);

}  // namespace recording
