// SigMF archives: a recording's two files in a tar file. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <nlohmann/json_fwd.hpp>
#include <optional>
#include <span>
#include <string>

#include "recording/byte_sink.hpp"
#include "recording/options.hpp"
#include "recording/source.hpp"

namespace recording {

/// Opens a file whose name says that it is an archive (.sigmf, .tar, either with a suffix of a compression, .tgz); gives
/// nothing for others. A compressed archive can be read from front to back alone: it is not ranged. Throws failure.
std::optional<source> open_sigmf_archive(const std::filesystem::path &path, const options &said);

/// Writes an archive with one recording: the metadata, then the samples, in a folder of the recording's name.
class sigmf_archive_writer final : public byte_sink {
 public:
  /// The sink outlives the writer. Throws failure.
  sigmf_archive_writer(byte_sink &to, const std::string &name, const nlohmann::json &metadata,
                       std::uint64_t data_bytes);
  sigmf_archive_writer(const sigmf_archive_writer &) = delete;
  sigmf_archive_writer &operator=(const sigmf_archive_writer &) = delete;
  ~sigmf_archive_writer();

  /// Appends to the samples, in all data_bytes.
  void write(std::span<const std::byte> bytes) override;
  /// Ends the archive; nothing is written afterwards.
  void finish();

 private:
  struct state;

  std::unique_ptr<state> state_;
};

}  // namespace recording
