// SPDX-License-Identifier: MIT
#include "commands/resampling_options.hpp"

#include <fmt/core.h>

#include <nlohmann/json.hpp>
#include <utility>

#include "commands/arguments.hpp"
#include "terminal/units.hpp"

namespace tool {

void add_resampling_options(CLI::App &app, resampling_arguments &arguments) {
  app.add_option("--passband", arguments.passband,
                 "Keep so much of half the lower rate to either side of the centre (default 0.9)")
      ->option_text("FRACTION")
      ->transform(number_where("a number above 0, to 0.99", [](double x) { return x > 0 && x <= 0.99; }));
  app.add_option("--rejection", arguments.rejection_db,
                 fmt::format("Reject aliases and images by so much (default {:g})", arguments.rejection_db))
      ->option_text("DB")
      ->transform(number_where("a number from 40 to 120", [](double x) { return x >= 40 && x <= 120; }));
  app.add_option("--datatype", arguments.datatype,
                 "Sample type to write (default: cf32_le, or rf32_le where the result is real)")
      ->option_text("NAME");
  // Tests alone use this option: how much is read at a time must not change the result.
  app.add_option("--block", arguments.block)->group("")->check(CLI::Range(1, 1 << 27));
}

void resampled_result::end_stretch(const sample_range &of) {
  const std::uint64_t before = pieces.empty() ? 0 : pieces.back().at + pieces.back().samples;
  pieces.push_back({of.first, of.samples, before, file.samples() - before});
}

void resampled_result::finish(const recording::source &source, recording::derivation made) {
  made.pieces = pieces;
  made.datatype = file.datatype();
  file.write(recording::derived_metadata(source, made));
}

nlohmann::ordered_json resampling_json(std::uint64_t samples_in, std::uint64_t samples_out,
                                       const filter_figures &figures) {
  return {{"samples_in", samples_in},
          {"samples_out", samples_out},
          {"rate_hz", figures.rate_hz},
          {"passband_hz", figures.pass_edge_hz},
          {"rejection_db", figures.rejection_db},
          {"ripple_db", figures.ripple_db}};
}

std::string length_text(std::uint64_t samples, double rate_hz) {
  return fmt::format("{} ({:.6g} s) at {}", samples, static_cast<double>(samples) / rate_hz, short_text(rate_hz));
}

void add_filter_lines(results &shown, const filter_figures &figures) {
  shown.add_line("Pass band", fmt::format("up to {} off the centre, ripple {:.2g} dB", short_text(figures.pass_edge_hz),
                                          figures.ripple_db));
  shown.add_line("Stop band", fmt::format("from {} off the centre, rejection {:.6g} dB",
                                          short_text(figures.stop_edge_hz), figures.rejection_db));
}

void add_result_lines(results &shown, const sigmf_result &file, double rate_hz) {
  shown.add_line("Output samples", length_text(file.samples(), rate_hz));
  if (file.clipped() > 0) shown.add_line("Clipped", fmt::format("{} samples beyond full scale", file.clipped()));
  shown.add_line("Data", file.files().data.string());
  shown.add_line("Metadata", file.files().metadata.string());
}

}  // namespace tool
