// lumra resample: a recording at a new rate, as SigMF. SPDX-License-Identifier: MIT
#include <fmt/core.h>

#include <complex>
#include <lumra/lumra.hpp>
#include <memory>
#include <nlohmann/json.hpp>
#include <vector>

#include "commands/arguments.hpp"
#include "commands/commands.hpp"
#include "commands/resampling_options.hpp"
#include "recording/open.hpp"
#include "terminal/failure.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

namespace fs = std::filesystem;

struct resample_command {
  std::string path, output;
  recording::options options;
  resampling_arguments resampling{100};
  output_arguments outputs;
  double rate = 0;  // 0: not said
};

/// Blocks of the recording give so many times their samples at once, which are held; downwards the library sets the end.
constexpr double highest_factor = 1e4, lowest_factor = 1e-9;

fs::path output_base(const resample_command &command, const recording::source &source) {
  if (!command.output.empty()) return result_base(command.output);
  if (source.files.empty()) throw failure("the standard input: say how the result is called, with --output BASE");
  return source.files.front().parent_path() /
         fmt::format("{}-{:.12g}Hz", source.files.front().stem().string(), command.rate);
}

lumra::resampling settings_for(const resample_command &command, const recording::source &source) {
  const double factor = command.rate / source.rate;
  if (!(factor <= highest_factor && factor > lowest_factor))
    throw failure("{}: from {} to {} is beyond a factor of {:g}; resample in several steps", source.data.string(),
                  exact_text(source.rate), exact_text(command.rate), factor > 1 ? highest_factor : 1 / lowest_factor);
  lumra::resampling how{.input_rate_hz = source.rate, .output_rate_hz = command.rate};
  how.passband = command.resampling.passband;
  how.rejection_db = command.resampling.rejection_db;
  return how;
}

struct resampled {
  std::uint64_t samples_in;
  filter_figures filter;
};

/// Writes the samples of all stretches, each from its first to its last.
template <class T>
resampled run(const recording::source &source, const selection &chosen, const lumra::resampling &how,
              std::uint64_t block, resampled_result &result) {
  lumra::stream_resampler<T> resampler(how);
  std::vector<T> out;
  const auto take = [&](const sample_block &samples) {
    out.resize(resampler.output_count(samples.count));
    (void)resampler(samples_of<T>(samples), out);
    result.file.write(std::span<const T>(out));
  };
  const auto end = [&](const sample_range &stretch) {
    out.resize(resampler.flush_count());
    (void)resampler.flush(out);
    result.file.write(std::span<const T>(out));
    result.end_stretch(stretch);
  };
  const auto done = each_stretch(source, chosen, static_cast<std::size_t>(block), "Resampling", take, end);
  const lumra_resampler_figures is = resampler.figures();
  return {done, {how.output_rate_hz, is.pass_edge_hz, is.stop_edge_hz, is.ripple_db, is.rejection_db}};
}

results run(const resample_command &command) {
  const recording::source source = recording::open(command.path, command.options);
  const selection chosen = select_all(source);
  const lumra::resampling how = settings_for(command, source);
  const recording::sample_format usual{.is_complex = source.format.is_complex},
      format = result_format(source, command.resampling.datatype, usual);
  results given(source.files);
  const output_files reports = begin_outputs(given, command.outputs);
  resampled_result result{sigmf_result(given, source, output_base(command, source), format), {}};
  const auto work = source.format.is_complex ? &run<std::complex<float>> : &run<float>;
  const resampled made = work(source, chosen, how, command.resampling.block, result);
  result.finish(source, {.pieces = {},
                         .rate = command.rate,
                         .frequency = {},
                         .datatype = {},
                         .description = fmt::format("resampled from {} to {} by lumra {}", exact_text(source.rate),
                                                    exact_text(command.rate), lumra::library().version_text)});

  given.add_line("Recording", fmt::format("{} ({})", source.data.string(), source.datatype));
  given.add_line("Input samples", length_text(made.samples_in, source.rate));
  given.add_line("Centre frequency", source.frequency   ? exact_text(*source.frequency)
                                     : chosen.frequency ? "another one in each capture"
                                                        : "unknown");
  add_filter_lines(given, made.filter);
  add_result_lines(given, result.file, command.rate);
  if (reports.json) write_json(*reports.json, resampling_json(made.samples_in, result.file.samples(), made.filter));
  add_output_lines(given, command.outputs);
  return given;
}

}  // namespace

void add_resample(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<resample_command>();
  CLI::App *app = add_command(program, "resample", "A recording at a new rate, as SigMF");
  app->footer(
      "Output sample k lies at the time k / rate, exactly, as far as the recording reaches. What lies beyond half the "
      "lower rate is rejected. Every capture is resampled for itself, unless it continues the one before. Captures "
      "and annotations are carried over; annotations are cut to the new band.");
  app->add_option("RECORDING", command->path, recording_help)->required();
  app->add_option("--to", command->rate, "The new sample rate (required)")
      ->option_text("HZ")
      ->transform(positive_number());
  add_resampling_options(*app, command->resampling);
  add_recording_options(*app, command->options);
  add_capture_option(*app, command->options, capture_help);
  app->add_option("--output", command->output,
                  "Write BASE.sigmf-data and BASE.sigmf-meta (default: the recording's name with the new rate)")
      ->option_text("BASE");
  add_outputs(*app, command->outputs, {nullptr, nullptr, false, false});
  app->callback([command, &work] {
    if (command->rate == 0)
      throw wrong_usage("--to is required{}",
                        command->options.rate ? ": it is the new rate, --rate is that of the recording" : "");
    work = [command] { return run(*command); };
  });
}

}  // namespace tool
