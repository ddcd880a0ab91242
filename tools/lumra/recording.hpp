// A recording on disk: which samples, where, how fast, around which frequency. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <nlohmann/json_fwd.hpp>
#include <optional>
#include <string>
#include <vector>

#include "sample_format.hpp"

namespace tool {

/// Samples that lie behind each other in the file.
struct extent {
  std::uint64_t offset;  // of the first byte
  std::uint64_t samples;
};

/// The extents follow each other in time without a gap.
struct recording {
  std::string name;            // for titles: the file's name without folder and suffix
  std::filesystem::path data;  // the file with the samples
  sample_format format;
  double rate = 0;                  // samples per second, positive
  std::optional<double> frequency;  // centre in hertz, where known
  std::vector<extent> extents;
  std::shared_ptr<const nlohmann::json> metadata;  // all that SigMF says; none for a raw file
  std::uint64_t first_index = 0;                   // the metadata's index of the first sample
  std::vector<std::filesystem::path> files;        // all that is read; outputs must not be among them

  [[nodiscard]] std::uint64_t samples() const noexcept;
};

/// What the command line says over the recording's own metadata.
struct recording_options {
  std::string rate_option = "--rate";  // its name, for messages
  std::optional<double> rate;
  std::optional<std::string> format;
  std::optional<std::uint64_t> capture;  // index of the one capture to use
};

/// Opens a SigMF recording by either of its files or their common name, or a raw file. Throws failure.
recording open_recording(const std::filesystem::path &path, const recording_options &options);

/// Size of a regular file; throws failure when there is none or it cannot be read.
std::uint64_t readable_size(const std::filesystem::path &file);

}  // namespace tool
