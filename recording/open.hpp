// Opening of a recording of any kind. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>

#include "recording/options.hpp"
#include "recording/source.hpp"

namespace recording {

/// Opens a SigMF recording by either of its files or their common name, a SigMF archive, a WAV file, a raw file, or for
/// "-" the standard input, which can be read once. Throws failure.
source open(const std::filesystem::path &path, const options &said);

}  // namespace recording
