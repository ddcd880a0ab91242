// Writes a SigMF recording of complex single-precision samples. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <filesystem>
#include <nlohmann/json_fwd.hpp>
#include <span>

#include "recording/byte_sink.hpp"

namespace recording {

/// The two files of one recording.
struct sigmf_files {
  std::filesystem::path data, metadata;
};

/// BASE.sigmf-data and BASE.sigmf-meta.
sigmf_files sigmf_files_of(const std::filesystem::path &base);

/// Samples may be written piece by piece, metadata once; the sinks must outlive the writer.
class sigmf_writer {
 public:
  sigmf_writer(byte_sink &data, byte_sink &metadata) noexcept : data_(data), metadata_(metadata) {}

  void write(std::span<const std::complex<float>> samples);
  /// Writes an object of objects and lists, each item of which becomes one line: the size of the text does not depend
  /// on how deep it is nested. Texts may hold anything; what is not UTF-8 is replaced.
  void write(const nlohmann::json &metadata);

 private:
  byte_sink &data_, &metadata_;
};

}  // namespace recording
