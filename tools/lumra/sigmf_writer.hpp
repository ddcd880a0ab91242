// Writes a SigMF recording of complex single-precision samples. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <filesystem>
#include <nlohmann/json_fwd.hpp>
#include <span>
#include <vector>

#include "output_file.hpp"

namespace tool {

/// BASE.sigmf-data and BASE.sigmf-meta, which appear together at the end or not at all.
class sigmf_writer {
 public:
  /// Throws failure, as output_file does.
  sigmf_writer(const std::filesystem::path &base, const std::vector<std::filesystem::path> &inputs);

  void write(std::span<const std::complex<float>> samples);
  /// Texts may hold anything; what is not UTF-8 is replaced.
  void commit(const nlohmann::json &metadata);

 private:
  output_file data_, meta_;
};

}  // namespace tool
