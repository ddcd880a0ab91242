// A SigMF recording that a subcommand writes. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstdint>
#include <filesystem>
#include <nlohmann/json_fwd.hpp>
#include <span>
#include <string>
#include <vector>

#include "recording/sample_encoder.hpp"
#include "recording/sample_format.hpp"
#include "recording/sigmf_writer.hpp"
#include "recording/source.hpp"
#include "terminal/results.hpp"

namespace tool {

/// The common name of both files, of which either may be said. Throws failure for a folder.
std::filesystem::path result_base(std::filesystem::path said);

/// The format that a datatype names, or where it is empty the usual one. Throws failure where half of the samples would
/// be lost.
recording::sample_format result_format(const recording::source &source, const std::string &datatype,
                                       recording::sample_format usual);

void write_metadata(output_file &file, const nlohmann::json &metadata);

/// Samples in pieces, then the metadata. Real samples become complex where the format is.
class sigmf_result {
 public:
  /// Begins both files of a recording that is made from the source. Throws failure.
  sigmf_result(results &given, const recording::source &from, const std::filesystem::path &base,
               const recording::sample_format &format);

  /// Throws failure for samples beyond single precision.
  void write(std::span<const std::complex<float>> samples);
  void write(std::span<const float> samples);
  void write(const nlohmann::json &metadata) { write_metadata(metadata_, metadata); }

  [[nodiscard]] const recording::sigmf_files &files() const noexcept { return files_; }
  [[nodiscard]] std::string datatype() const { return format_.name(); }
  [[nodiscard]] std::uint64_t samples() const noexcept { return samples_; }
  [[nodiscard]] std::uint64_t clipped() const noexcept { return encoder_.clipped(); }

 private:
  void require_finite(std::span<const float> parts) const;

  std::filesystem::path source_;  // for messages
  recording::sigmf_files files_;
  recording::sample_format format_;
  output_file &data_, &metadata_;
  recording::sample_encoder encoder_;
  std::uint64_t samples_ = 0;
  std::vector<double> wide_;
  std::vector<std::complex<float>> complex_;
};

}  // namespace tool
