// What SigMF metadata say about samples. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>
#include <memory>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "recording/options.hpp"
#include "recording/source.hpp"

namespace recording {

/// The name of the file with the samples: what core:dataset says, a name without a folder, or else `usual`. Throws
/// failure.
std::string dataset_name(const nlohmann::json &metadata, const std::string &usual, const std::string &where);

/// Fills in what the metadata say; the paths are there. `where` is their name for messages, data_bytes the size of the
/// file with the samples. Throws failure where the samples cannot be read.
void describe(source &result, std::shared_ptr<const nlohmann::json> metadata, const std::string &where,
              std::uint64_t data_bytes, const options &said);

}  // namespace recording
