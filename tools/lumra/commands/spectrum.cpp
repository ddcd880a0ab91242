// lumra spectrum: averaged power spectra of recordings as summary, JSON, CSV and picture. SPDX-License-Identifier: MIT
#include <fmt/core.h>

#include <algorithm>
#include <cmath>
#include <memory>
#include <nlohmann/json.hpp>

#include "analysis/spectrum_accumulator.hpp"
#include "commands/arguments.hpp"
#include "commands/commands.hpp"
#include "commands/each_spectrum.hpp"
#include "commands/inputs.hpp"
#include "commands/spectrum_options.hpp"
#include "pictures/spectrum_picture.hpp"
#include "terminal/failure.hpp"
#include "terminal/progress.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

struct spectrum_command {
  input_arguments inputs;
  spectrum_arguments spectrum;
  output_arguments outputs;
  std::size_t peaks = 1;
  std::optional<double> centre_hz, span_hz;
  double every_s = 0;
};

/// The bins that are shown and written.
bin_range shown_bins(const spectrum_command &command, const lumra::averaged_spectrum &spectrum,
                     const recording::source &source) {
  if (!command.span_hz) return all_bins(spectrum);
  const double last = static_cast<double>(spectrum.power.size() - 1);
  const double low_end = spectrum.frequency(0), high_end = spectrum.frequency(spectrum.power.size() - 1);
  const double centre = command.centre_hz.value_or((low_end + high_end + spectrum.info.spacing_hz) / 2);
  const double low = (centre - *command.span_hz / 2 - low_end) / spectrum.info.spacing_hz;
  const double high = (centre + *command.span_hz / 2 - low_end) / spectrum.info.spacing_hz;
  // A bin that is beyond an end by rounding alone is on it.
  constexpr double rounding = 1e-6;
  const double first = std::max(std::ceil(low - rounding), 0.0), end = std::min(std::floor(high + rounding), last);
  if (first > end)
    throw failure("{}: has no bin within {} around {}; its band is {} to {}", source.data.string(),
                  short_text(*command.span_hz), exact_text(centre), frequency_text(low_end, spectrum.info.spacing_hz),
                  frequency_text(high_end, spectrum.info.spacing_hz));
  return {static_cast<std::size_t>(first), static_cast<std::size_t>(end) + 1};
}

void write_csv_header(output_file &csv, const spectrum_command &command) {
  const char *unit = command.outputs.level_column();
  csv.print("{}frequency_hz,level_{}", command.inputs.paths.size() > 1 ? "recording," : "", unit);
  if (command.spectrum.hold) csv.print(",maximum_{},minimum_{}", unit, unit);
  csv.print("\n");
}

void write_csv(output_file &csv, const spectrum_command &command, const recording::source &source,
               const lumra::averaged_spectrum &spectrum, bin_range bins) {
  progress bar("Writing CSV");
  const std::string name = command.inputs.paths.size() > 1 ? csv_text(source.path.string()) + "," : "";
  const auto level = [&](double power) { return csv_number(decibels(power) + command.outputs.calibration_db); };
  for (std::size_t k = bins.first; k < bins.second; ++k) {
    csv.print("{}{},{}", name, spectrum.frequency(k), level(spectrum.power[k]));
    if (command.spectrum.hold) csv.print(",{},{}", level(spectrum.maximum[k]), level(spectrum.minimum[k]));
    csv.print("\n");
    if (k % 65536 == 0) bar.update(k - bins.first, bins.second - bins.first);
  }
}

void summarise(results &shown, const spectrum_command &command, const lumra::averaged_spectrum &spectrum,
               const std::vector<lumra::peak> &peaks) {
  const double whole = total_power(spectrum);
  shown.add_line("Total power",
                 whole > 0 ? level_text(decibels(whole), command.outputs) : "none: all samples are zero");
  for (std::size_t i = 0; i < peaks.size(); ++i)
    shown.add_line(i == 0 ? "Peak" : "", peak_text(peaks[i], spectrum, command.outputs));
  if (!peaks.empty() && peaks.front().power > 1.01)
    shown.add_line("Note", "samples exceed full scale (amplitude 1.0), as unscaled floating-point recordings do");
}

nlohmann::ordered_json json_of(const spectrum_command &command, const recording::source &source,
                               const lumra::averaged_spectrum &spectrum, const std::vector<lumra::peak> &peaks) {
  auto object = spectrum_json(command.spectrum, source, spectrum);
  add_peaks_json(object, peaks, spectrum, command.outputs);
  return object;
}

/// One spectrum for each interval, written as soon as the interval is over.
results run_intervals(const spectrum_command &command) {
  const std::vector<recording::source> sources = open_all(command.inputs);
  const recording::source &source = sources.front();
  const selection chosen = select_frequency(source);
  const lumra::spectrum_settings settings = settings_for(command.spectrum, source, chosen, command.outputs);
  const double samples = std::round(command.every_s * source.rate);
  if (!(samples >= static_cast<double>(settings.points) && samples < 0x1p62))
    throw failure("{}: an interval of {} s is shorter than a segment of {} samples; use a longer --every",
                  source.data.string(), command.every_s, settings.points);
  const auto interval = static_cast<std::uint64_t>(samples);

  results given(files_of(sources));
  output_file &json = *begin_outputs(given, command.outputs).json;
  sample_blocks blocks(source, chosen,
                       static_cast<std::size_t>(std::min<std::uint64_t>(interval, sample_blocks::usual_size)));
  spectrum_accumulator accumulator(settings, blocks.is_real());
  std::uint64_t added = 0, intervals = 0, done = 0;
  const auto end_interval = [&] {
    accumulator.gap();
    if (accumulator.segments() > 0) {
      const lumra::averaged_spectrum spectrum = accumulator.read();
      const auto peaks = highest_peaks(spectrum, shown_bins(command, spectrum, source), command.peaks);
      write_json(json, json_of(command, source, spectrum, peaks));
      json.flush();
      ++intervals;
    }
    accumulator.clear();
    added = 0;
  };
  progress bar("Analysing");
  while (const auto block = blocks.next()) {
    if (block->begins_stretch && done > 0) end_interval();
    for (std::size_t from = 0; from < block->count;) {
      const auto part = static_cast<std::size_t>(std::min<std::uint64_t>(block->count - from, interval - added));
      accumulator.add(block->part(from, part));
      from += part;
      added += part;
      if (added == interval) end_interval();
    }
    done += block->count;
    bar.update(done, chosen.samples == recording::endless ? 0 : chosen.samples);
  }
  end_interval();
  given.add_line("Recording", fmt::format("{} ({})", source.data.string(), source.datatype));
  given.add_line("Intervals", fmt::format("{} of {:g} s", intervals, command.every_s));
  add_output_lines(given, command.outputs);
  return given;
}

results run(const spectrum_command &command) {
  if (command.every_s > 0) return run_intervals(command);
  return each_spectrum(
      command.inputs, command.spectrum, command.outputs, [&](output_file &csv) { write_csv_header(csv, command); },
      [&](const measured_spectrum &of) {
        const bin_range bins = shown_bins(command, of.spectrum, of.source);
        const auto peaks = highest_peaks(of.spectrum, bins, command.peaks);
        summarise(of.given, command, of.spectrum, peaks);
        if (of.files.json) write_json(*of.files.json, json_of(command, of.source, of.spectrum, peaks));
        if (of.files.csv) write_csv(*of.files.csv, command, of.source, of.spectrum, bins);
        if (of.picture) add_curve(*of.picture, command.spectrum, of.source, of.spectrum, bins, peaks, command.outputs);
      });
}

}  // namespace

void add_spectrum(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<spectrum_command>();
  CLI::App *app = add_command(program, "spectrum", "Averaged power spectrum of recordings, in dB of full scale");
  app->footer(
      "A full-scale tone on a bin reads 0 dBFS with every window. Captures of one frequency are averaged; of several "
      "frequencies, the one that most samples have is taken.");
  add_inputs(*app, command->inputs);
  add_spectrum_options(*app, command->spectrum);
  app->add_flag("--hold", command->spectrum.hold, "Also keep the highest and the lowest segment of each bin");
  app->add_option("--peaks", command->peaks, "Show so many of the highest peaks (default 1)")
      ->option_text("N")
      ->transform(whole_number(0, 1000000));
  auto *span = app->add_option("--span", command->span_hz, "Show and write this width alone, around the centre")
                   ->option_text("HZ")
                   ->transform(positive_number());
  app->add_option("--center", command->centre_hz, "Centre of the span (default: that of the recording)")
      ->option_text("HZ")
      ->transform(any_number())
      ->needs(span);
  auto *every = app->add_option("--every", command->every_s,
                                "Write one JSON object for each interval, as soon as it is over, for streams")
                    ->option_text("SECONDS")
                    ->transform(positive_number());
  add_outputs(*app, command->outputs, {"Write frequency and level of every bin", "Draw the spectrum"});
  every->needs("--json")->excludes("--csv")->excludes("--plot")->excludes("--hold");
  app->callback([command, &work] {
    if (command->every_s > 0 && command->inputs.paths.size() > 1)
      throw wrong_usage("--every: takes one recording, not {}", command->inputs.paths.size());
    work = [command] { return run(*command); };
  });
}

}  // namespace tool
