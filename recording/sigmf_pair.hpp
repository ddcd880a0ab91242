// SigMF recordings of two files. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>
#include <optional>

#include "recording/options.hpp"
#include "recording/source.hpp"

namespace recording {

/// Opens a recording by the name of either file, or by their common name. Gives nothing where the path is none of
/// these; data without metadata are a raw file where the options say their type. Throws failure.
std::optional<source> open_sigmf_pair(const std::filesystem::path &path, const options &said);

}  // namespace recording
