// SigMF archives: a recording's two files in a tar file. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>
#include <optional>

#include "recording/options.hpp"
#include "recording/source.hpp"

namespace recording {

/// Opens a file whose name says that it is an archive (.sigmf, .tar, either with a suffix of a compression, .tgz);
/// gives nothing for others. A compressed archive can be read from front to back alone: it is not ranged. Throws failure.
std::optional<source> open_sigmf_archive(const std::filesystem::path &path, const options &said);

}  // namespace recording
