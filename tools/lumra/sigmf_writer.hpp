// Writes a SigMF recording of complex single-precision samples. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <filesystem>
#include <nlohmann/json_fwd.hpp>
#include <span>

#include "results.hpp"

namespace tool {

/// BASE.sigmf-data and BASE.sigmf-meta among the results.
class sigmf_writer {
 public:
  /// Throws failure, as results do.
  sigmf_writer(results &among, const std::filesystem::path &base);

  void write(std::span<const std::complex<float>> samples);
  /// An object of objects and lists, each item of which becomes one line: the size of the text does not depend on how
  /// deep it is nested. Texts may hold anything; what is not UTF-8 is replaced.
  void write(const nlohmann::json &metadata);

 private:
  output_file &data_, &meta_;
};

}  // namespace tool
