// Writes a SigMF recording of complex samples. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <filesystem>
#include <nlohmann/json_fwd.hpp>
#include <span>
#include <string>

#include "recording/byte_sink.hpp"
#include "recording/sample_encoder.hpp"

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

/// Samples may be written piece by piece, metadata once; the sinks must outlive the writer.
class sigmf_writer {
 public:
  sigmf_writer(byte_sink &data, byte_sink &metadata, const sample_format &format = {}) noexcept
      : samples_(data, format), metadata_(metadata) {}

  void write(std::span<const std::complex<float>> samples) { samples_.write(samples); }
  void write(const nlohmann::json &metadata);
  /// How many samples were beyond the type's full scale.
  [[nodiscard]] std::uint64_t clipped() const noexcept { return samples_.clipped(); }

 private:
  sample_encoder samples_;
  byte_sink &metadata_;
};

}  // namespace recording
