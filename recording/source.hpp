// A recording that can be read: which samples, where, how fast, around which frequency. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <nlohmann/json_fwd.hpp>
#include <optional>
#include <string>
#include <vector>

#include "recording/sample_format.hpp"

namespace recording {

/// Samples that lie behind each other in the file.
struct extent {
  std::uint64_t offset;  // of the first byte
  std::uint64_t samples;
};

/// The extents follow each other in time without a gap.
struct source {
  std::string name;            // for titles: the file's name without folder and suffix
  std::filesystem::path data;  // the file with the samples
  sample_format format;
  double rate = 0;                  // samples per second, positive
  std::optional<double> frequency;  // centre in hertz, where known
  std::vector<extent> extents;
  std::shared_ptr<const nlohmann::json> metadata;  // all that SigMF says; none for a raw file
  std::uint64_t first_index = 0;                   // the metadata's index of the first sample
  std::vector<std::filesystem::path> files;        // all that is read; outputs must not be among them

  [[nodiscard]] std::uint64_t samples() const noexcept {
    std::uint64_t sum = 0;
    for (const extent &e : extents) sum += e.samples;
    return sum;
  }
};

}  // namespace recording
