// How a SigMF recording is written. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>
#include <nlohmann/json_fwd.hpp>
#include <string>

namespace recording {

/// The two files of one recording.
struct sigmf_files {
  std::filesystem::path data, metadata;
};

/// BASE.sigmf-data and BASE.sigmf-meta.
sigmf_files sigmf_files_of(const std::filesystem::path &base);

/// The text of metadata, an object of objects and lists, each item of which becomes one line: its size does not depend
/// on how deep it is nested. Texts may hold anything; what is not UTF-8 is replaced.
std::string metadata_text(const nlohmann::json &metadata);

}  // namespace recording
