// SigMF metadata. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>

#include "recording.hpp"

namespace tool {

/// Reads a .sigmf-meta file and finds the samples that it describes. Throws failure.
recording open_sigmf(const std::filesystem::path &meta, const recording_options &options);

}  // namespace tool
