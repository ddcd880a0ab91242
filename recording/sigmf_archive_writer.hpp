// Writes SigMF archives. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <nlohmann/json_fwd.hpp>
#include <span>
#include <string>

#include "recording/byte_sink.hpp"

namespace recording {

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
