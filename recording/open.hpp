// Opening of a recording of any kind. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>

#include "recording/options.hpp"
#include "recording/source.hpp"

namespace recording {

/// Opens a SigMF recording by either of its files or their common name, or a raw file. Throws failure.
source open(const std::filesystem::path &path, const options &said);

}  // namespace recording
