// lumra resample: a recording at a new rate, as SigMF. SPDX-License-Identifier: MIT
#include <fmt/core.h>

#include <cmath>
#include <lumra/lumra.hpp>
#include <memory>
#include <nlohmann/json.hpp>

#include "analysis/resampling.hpp"
#include "commands/arguments.hpp"
#include "commands/commands.hpp"
#include "recording/derived_metadata.hpp"
#include "recording/open.hpp"
#include "recording/sigmf_writer.hpp"
#include "terminal/failure.hpp"
#include "terminal/results.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

namespace fs = std::filesystem;

struct resample_command {
  std::string path, output;
  recording::options options;
  output_arguments outputs;
  double rate = 0;  // 0: not said
  std::uint64_t block = std::uint64_t{1} << 16;
};

/// The common name of the files to write.
fs::path output_base(const resample_command &command, const recording::source &source) {
  fs::path base = command.output;
  if (base.empty())
    return source.files.front().parent_path() /
           fmt::format("{}-{:.12g}Hz", source.files.front().stem().string(), command.rate);
  if (base.extension() == ".sigmf-data" || base.extension() == ".sigmf-meta") base.replace_extension();
  if (!base.has_filename()) throw failure("{}: is a folder; give the result a name in it", base.string());
  return base;
}

std::string length_text(std::uint64_t samples, double rate) {
  return fmt::format("{} ({:.6g} s) at {}", samples, static_cast<double>(samples) / rate, short_text(rate));
}

void summarise(results &shown, const resample_command &command, const recording::source &source, const resampling &work,
               const recording::sigmf_files &files) {
  const resampling_filter &filter = work.filter();
  const double lower = std::min(source.rate, work.rate());
  shown.add_line("Recording", fmt::format("{} ({})", source.data.string(), source.datatype));
  shown.add_line("Input samples", length_text(work.samples_in(), source.rate));
  shown.add_line("Output samples", length_text(work.samples(), work.rate()));
  shown.add_line("Centre frequency", source.frequency ? exact_text(*source.frequency) : "unknown");
  shown.add_line("Ratio", fmt::format("{:.17g} input samples per output sample", work.ratio()));
  if (work.rate() != command.rate)
    shown.add_line("Note", fmt::format("the ratio is rounded to single precision: the new rate, as in the metadata, is "
                                       "{:.17g} Hz ({:+.2g} ppm)",
                                       work.rate(), 1e6 * (work.rate() / command.rate - 1)));
  shown.add_line("Prototype", fmt::format("Kaiser low-pass, {} coefficients, {} phases, interpolated linearly",
                                          filter.coefficients.size(), filter.phases));
  shown.add_line("Pass band", fmt::format("up to {} off the centre, ripple {:.2g} dB",
                                          short_text(filter.pass_edge * lower), 20 * std::log10(1 + filter.ripple)));
  shown.add_line("Stop band", fmt::format("from {} off the centre, rejection {:.1f} dB",
                                          short_text(filter.stop_edge * lower), -20 * std::log10(filter.rejection)));
  shown.add_line("Data", files.data.string());
  shown.add_line("Metadata", files.metadata.string());
}

nlohmann::ordered_json json_of(const recording::source &source, const resampling &work) {
  const resampling_filter &filter = work.filter();
  return {{"samples_in", work.samples_in()},
          {"samples_out", work.samples()},
          {"rate_hz", work.rate()},
          {"passband_hz", filter.pass_edge * std::min(source.rate, work.rate())},
          {"rejection_db", -20 * std::log10(filter.rejection)},
          {"ripple_db", 20 * std::log10(1 + filter.ripple)}};
}

results run(const resample_command &command) {
  const recording::source source = recording::open(command.path, command.options);
  const recording::stretch &over = recording::only_stretch(source, command.options.names);
  const resampling work(source, over, command.rate);
  const recording::sigmf_files files = recording::sigmf_files_of(output_base(command, source));
  results given(source.files);
  const output_files reports = begin_outputs(given, command.outputs);
  output_file &data = given.add_file(files.data);
  recording::sigmf_writer output(data, given.add_file(files.metadata));
  const nlohmann::json metadata = recording::derived_metadata(
      source, {.first = over.first,
               .samples_in = over.samples,
               .ratio = work.ratio(),
               .samples = work.samples(),
               .rate = work.rate(),
               .frequency = {},
               .datatype = "cf32_le",
               .description = fmt::format("resampled from {} to {} by lumra {}", exact_text(source.rate),
                                          short_text(work.rate()), lumra::library().version_text)});
  work.run(command.block, [&](std::span<const std::complex<float>> x) { output.write(x); });
  output.write(metadata);
  summarise(given, command, source, work, files);
  if (reports.json) write_json(*reports.json, json_of(source, work));
  add_output_lines(given, command.outputs);
  return given;
}

}  // namespace

void add_resample(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<resample_command>();
  CLI::App *app = add_command(program, "resample", "A recording at a new rate, as SigMF");
  app->footer(
      "Output sample k lies at input sample k * ratio, from the first on, as far as the recording reaches. The pass "
      "band "
      "is 0.9 of the lower of both rates, half to either side of the centre; what lies beyond half the lower rate is "
      "rejected. Samples are written as cf32_le. Metadata are carried over where they are still true.");
  app->add_option("RECORDING", command->path, recording_help)->required();
  app->add_option("--to", command->rate, "The new sample rate (required)")
      ->option_text("HZ")
      ->transform(positive_number());
  add_recording_options(*app, command->options);
  add_capture_option(*app, command->options, capture_help);
  app->add_option("--output", command->output,
                  "Write BASE.sigmf-data and BASE.sigmf-meta (default: the recording's name with the new rate)")
      ->option_text("BASE");
  // Tests alone use this option: how much is read at a time must not change the result.
  app->add_option("--block", command->block)->group("")->check(CLI::Range(1, 1 << 27));
  add_outputs(*app, command->outputs, {nullptr, nullptr, false, false});
  app->callback([command, &work] {
    if (command->rate == 0)
      throw wrong_usage("--to is required{}",
                        command->options.rate ? ": it is the new rate, --rate is that of the recording" : "");
    work = [command] { return run(*command); };
  });
}

}  // namespace tool
