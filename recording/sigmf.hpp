// SigMF metadata. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>
#include <optional>

#include "recording/options.hpp"
#include "recording/source.hpp"

namespace recording {

/// Opens a recording by the name of either file, or by their common name: reads the metadata and finds the samples that
/// they describe. Gives nothing where the path is no SigMF recording; data without metadata are a raw file where the
/// options say their type. Throws failure.
std::optional<source> open_sigmf(const std::filesystem::path &path, const options &said);

}  // namespace recording
