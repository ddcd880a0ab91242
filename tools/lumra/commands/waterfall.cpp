// lumra waterfall: levels over time and frequency. SPDX-License-Identifier: MIT
#include <fmt/core.h>

#include <cmath>
#include <memory>
#include <nlohmann/json.hpp>

#include "analysis/waterfall_rows.hpp"
#include "commands/arguments.hpp"
#include "commands/commands.hpp"
#include "commands/inputs.hpp"
#include "commands/spectrum_options.hpp"
#include "pictures/waterfall_picture.hpp"
#include "terminal/failure.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

/// More bins than these share columns.
constexpr std::size_t most_columns = 2048;

struct waterfall_command {
  input_arguments inputs;
  spectrum_arguments spectrum{.usual_size = 1024};
  output_arguments outputs;
  std::size_t rows = 400;
  std::string range_text;

  std::optional<std::pair<double, double>> range_db;
};

void parse(waterfall_command &command) {
  if (command.range_text.empty()) return;
  const std::vector<double> numbers = parse_numbers("--range", command.range_text, ':');
  if (numbers.size() != 2 || !(numbers[0] < numbers[1]))
    throw wrong_usage("--range: '{}' is not LOW:HIGH with LOW below HIGH", command.range_text);
  command.range_db = {numbers[0], numbers[1]};
}

/// The outer edges of all bins.
std::pair<double, double> edges_of(const lumra::averaged_spectrum &spectrum) {
  const double half = spectrum.info.spacing_hz / 2;
  return {spectrum.frequency(0) - half, spectrum.frequency(spectrum.power.size() - 1) + half};
}

void write_csv(output_file &csv, const waterfall_command &command, const recording::source &source,
               const selection &chosen, const waterfall_rows &waterfall) {
  // Times count as everywhere from the recording's begin; a column is named by its middle.
  const auto [low, high] = edges_of(waterfall.whole);
  const bool named = command.inputs.paths.size() > 1;
  csv.print("{}time_s", named ? "recording," : "");
  for (std::size_t c = 0; c < waterfall.columns; ++c)
    csv.print(",{:.15g}", low + (static_cast<double>(c) + 0.5) * (high - low) / static_cast<double>(waterfall.columns));
  csv.print("\n");
  const double begin = static_cast<double>(chosen.stretches.front().first) / source.rate;
  for (std::size_t r = 0; r < waterfall.rows.size(); ++r) {
    if (named) csv.print("{},", csv_text(source.path.string()));
    csv.print("{:.12g}", begin + static_cast<double>(r) * waterfall.time_step_s);
    for (const float power : waterfall.rows[r])
      csv.print(",{}", csv_number(decibels(static_cast<double>(power)) + command.outputs.calibration_db, 2));
    csv.print("\n");
  }
}

void draw_waterfall(const waterfall_command &command, const recording::source &source, const selection &chosen,
                    waterfall_rows &waterfall, const output_files &files) {
  waterfall_picture picture;
  picture.title = source.name;
  picture.settings = settings_text(command.spectrum, waterfall.whole) +
                     fmt::format("  ·  {:.4g} ms a row", 1e3 * waterfall.time_step_s);
  if (waterfall.columns < waterfall.whole.power.size()) picture.settings += "  ·  highest bin of each column";
  picture.level_unit = command.outputs.level_unit();
  std::tie(picture.low_hz, picture.high_hz) = edges_of(waterfall.whole);
  picture.centre_hz = waterfall.whole.info.centre_hz;
  picture.begin_s = static_cast<double>(chosen.stretches.front().first) / source.rate;
  picture.step_s = waterfall.time_step_s;
  picture.range_db = command.range_db;
  for (std::vector<float> &row : waterfall.rows) {
    for (float &power : row)
      power = static_cast<float>(decibels(static_cast<double>(power)) + command.outputs.calibration_db);
    picture.levels_db.push_back(std::move(row));
  }
  const double end = picture.begin_s + static_cast<double>(chosen.samples) / source.rate;
  for (const recording::annotation &note : source.annotations) {
    const double begin = static_cast<double>(note.start) / source.rate;
    picture.boxes.push_back({note.low.value_or(picture.low_hz), note.high.value_or(picture.high_hz), begin,
                             note.samples ? begin + static_cast<double>(*note.samples) / source.rate : end,
                             note.label.empty() ? note.comment : note.label});
  }
  draw(waterfall_script(picture, files.type), files.type, *files.plot);
}

results run(const waterfall_command &command) {
  const std::vector<recording::source> sources = open_all(command.inputs);
  results given(files_of(sources));
  const output_files files = begin_outputs(given, command.outputs);
  for (const recording::source &source : sources) {
    selection chosen = select_stretch(source);
    const lumra::spectrum_settings settings = settings_for(command.spectrum, source, chosen, command.outputs);
    waterfall_rows waterfall = make_waterfall(source, chosen, settings, command.rows, most_columns);
    const auto peaks = highest_peaks(waterfall.whole, all_bins(waterfall.whole), 1);
    given.add_gap();
    add_recording_lines(given, source, chosen);
    add_spectrum_lines(given, command.spectrum, waterfall.whole, command.outputs);
    given.add_line("Rows", fmt::format("{} of {:.6g} s", waterfall.rows.size(), waterfall.time_step_s));
    if (files.json) {
      nlohmann::ordered_json object = {
          {"rows", waterfall.rows.size()}, {"bins", waterfall.columns}, {"time_step_s", waterfall.time_step_s}};
      object.update(spectrum_json(command.spectrum, source, waterfall.whole));
      add_peaks_json(object, peaks, waterfall.whole, command.outputs);
      write_json(*files.json, object);
    }
    if (files.csv) write_csv(*files.csv, command, source, chosen, waterfall);
    if (files.plot) draw_waterfall(command, source, chosen, waterfall, files);
  }
  add_output_lines(given, command.outputs);
  return given;
}

}  // namespace

void add_waterfall(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<waterfall_command>();
  CLI::App *app = add_command(program, "waterfall", "Levels over time and frequency as a picture");
  app->footer(
      "Time runs from top to bottom and counts from the recording's begin. Annotations are drawn as labelled boxes. Of "
      "captures that do not continue each other, the longest one is taken.");
  add_inputs(*app, command->inputs);
  app->add_option("--rows", command->rows, "Rows at most (default 400); of a stream up to twice as many")
      ->option_text("N")
      ->transform(whole_number(1, 4000));
  app->add_option("--range", command->range_text, "Levels of the colours (default: what is there)")
      ->option_text("LOW:HIGH");
  add_spectrum_options(*app, command->spectrum);
  add_outputs(*app, command->outputs, {"Write a row of levels for each time", "Draw the waterfall"});
  app->callback([command, &work] {
    parse(*command);
    if (!command->outputs.plot.empty() && command->inputs.paths.size() > 1)
      throw wrong_usage("--plot: a picture shows one waterfall, not {}", command->inputs.paths.size());
    work = [command] { return run(*command); };
  });
}

}  // namespace tool
