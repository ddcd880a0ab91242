// What subcommands take that write recordings at another rate. SPDX-License-Identifier: MIT
#pragma once

#include <CLI/CLI.hpp>
#include <cstdint>
#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

#include "analysis/each_stretch.hpp"
#include "commands/sigmf_result.hpp"
#include "recording/derived_metadata.hpp"

namespace tool {

struct resampling_arguments {
  explicit resampling_arguments(double usual_rejection_db) : rejection_db(usual_rejection_db) {}

  double passband = 0.9, rejection_db;
  std::string datatype;
  std::uint64_t block = sample_blocks::usual_size;
};

/// Adds --passband, --rejection and --datatype.
void add_resampling_options(CLI::App &app, resampling_arguments &arguments);

/// A result at another rate, and what of the source it is made of.
struct resampled_result {
  sigmf_result file;
  std::vector<recording::derived_piece> pieces;

  /// Behind a stretch, all of whose samples are written.
  void end_stretch(const sample_range &of);
  /// Writes the metadata; `made` lacks the pieces and the datatype.
  void finish(const recording::source &source, recording::derivation made);
};

/// What a result's filter does, in hertz from its centre.
struct filter_figures {
  double rate_hz, pass_edge_hz, stop_edge_hz, ripple_db, rejection_db;
};

/// Figures in JSON.
nlohmann::ordered_json resampling_json(std::uint64_t samples_in, std::uint64_t samples_out,
                                       const filter_figures &figures);
/// Lines of the summary.
void add_filter_lines(results &shown, const filter_figures &figures);
void add_result_lines(results &shown, const sigmf_result &file, double rate_hz);
std::string length_text(std::uint64_t samples, double rate_hz);

}  // namespace tool
