// lumra level: RMS, peak, crest factor, DC, clipping, power statistics and envelope. SPDX-License-Identifier: MIT
#include <fmt/core.h>

#include <cmath>
#include <memory>
#include <nlohmann/json.hpp>

#include "analysis/level_measurement.hpp"
#include "commands/arguments.hpp"
#include "commands/commands.hpp"
#include "commands/inputs.hpp"
#include "pictures/level_picture.hpp"
#include "terminal/failure.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

using nlohmann::ordered_json;

struct level_command {
  input_arguments inputs;
  output_arguments outputs;
  bool envelope = false;
};

ordered_json json_of(const level_command &command, const measured_level &measured) {
  const lumra_level_result &levels = measured.levels;
  const double added = command.outputs.calibration_db;
  ordered_json object = {{"samples", levels.samples},
                         {"rms_db", json_number(levels.rms_db + added)},
                         {"peak_db", json_number(levels.peak_db + added)},
                         {"peak_index", levels.peak_index},
                         {"crest_db", json_number(levels.crest_db)},
                         {"dc_i", json_number(levels.dc_re)},
                         {"dc_q", json_number(levels.dc_im)},
                         {"clipped", measured.clipped},
                         {"ccdf", ordered_json::array()}};
  for (std::size_t i = 0; i < measured.above_db.size(); ++i)
    object["ccdf"].push_back({{"above_db", measured.above_db[i]}, {"probability", measured.probability[i]}});
  return object;
}

/// Where the envelope's cell begins; captures stand one behind the other.
double cell_time(const measured_level &measured, std::size_t cell, double rate) {
  return static_cast<double>(cell) * static_cast<double>(measured.cell) / rate;
}

void write_csv_header(output_file &csv, const level_command &command) {
  if (command.inputs.paths.size() > 1) csv.print("recording,");
  if (command.envelope)
    csv.print("time_s,rms_{0},peak_{0}\n", command.outputs.level_column());
  else
    csv.print("above_db,probability\n");
}

void write_csv(output_file &csv, const level_command &command, const recording::source &source,
               const measured_level &measured) {
  const std::string name = command.inputs.paths.size() > 1 ? csv_text(source.path.string()) + "," : "";
  if (command.envelope)
    for (std::size_t i = 0; i < measured.envelope.size(); ++i)
      csv.print("{}{:.12g},{},{}\n", name, cell_time(measured, i, source.rate),
                csv_number(10 * std::log10(measured.envelope[i].power) + command.outputs.calibration_db),
                csv_number(10 * std::log10(measured.envelope[i].peak_power) + command.outputs.calibration_db));
  else
    for (std::size_t i = 0; i < measured.above_db.size(); ++i)
      csv.print("{}{},{:.9g}\n", name, measured.above_db[i], measured.probability[i]);
}

void summarise(results &shown, const level_command &command, const recording::source &source,
               const measured_level &measured) {
  const lumra_level_result &levels = measured.levels;
  if (levels.power > 0) {
    shown.add_line(
        "RMS", fmt::format("{:.2f} {}", levels.rms_db + command.outputs.calibration_db, command.outputs.level_unit()));
    shown.add_line("Peak", fmt::format("{:.2f} {} at sample {} ({:.9g} s)",
                                       levels.peak_db + command.outputs.calibration_db, command.outputs.level_unit(),
                                       levels.peak_index, static_cast<double>(levels.peak_index) / source.rate));
    shown.add_line("Crest factor", fmt::format("{:.2f} dB", levels.crest_db));
  } else {
    shown.add_line("RMS", "none: all samples are zero");
  }
  shown.add_line("DC", source.format.is_complex ? fmt::format("I {:+.6g}, Q {:+.6g}", levels.dc_re, levels.dc_im)
                                                : fmt::format("{:+.6g}", levels.dc_re));
  shown.add_line("Clipped", source.format.is_floating() ? "unknown: floating-point samples have no end of their range"
                            : measured.clipped == 0     ? "none"
                                                        : fmt::format("{} samples, {:.3g} %", measured.clipped,
                                                                      100.0 * static_cast<double>(measured.clipped) /
                                                                          static_cast<double>(levels.samples)));
}

envelope_curve envelope_of(const level_command &command, const recording::source &source,
                           const measured_level &measured) {
  envelope_curve curve{source.name, {}, {}, {}};
  const double added = command.outputs.calibration_db;
  const auto add = [&](double time, const envelope_cell &cell) {
    curve.time_s.push_back(time);
    curve.rms_db.push_back(10 * std::log10(cell.power) + added);
    curve.peak_db.push_back(10 * std::log10(cell.peak_power) + added);
  };
  for (std::size_t i = 0; i < measured.envelope.size(); ++i)
    add(cell_time(measured, i, source.rate), measured.envelope[i]);
  // The last cell is drawn to its end.
  add(static_cast<double>(measured.levels.samples) / source.rate, measured.envelope.back());
  return curve;
}

results run(const level_command &command) {
  const std::vector<recording::source> sources = open_all(command.inputs);
  results given(files_of(sources));
  const output_files files = begin_outputs(given, command.outputs);
  if (files.csv) write_csv_header(*files.csv, command);
  std::vector<ccdf_curve> shares;
  std::vector<envelope_curve> envelopes;
  std::string settings;
  for (const recording::source &source : sources) {
    selection chosen = select_frequency(source);
    const measured_level measured = measure_level(source, chosen, command.envelope);
    given.add_gap();
    add_recording_lines(given, source, chosen);
    summarise(given, command, source, measured);
    if (files.json) write_json(*files.json, json_of(command, measured));
    if (files.csv) write_csv(*files.csv, command, source, measured);
    if (!files.plot) continue;
    if (settings.empty() && measured.levels.power > 0)
      settings =
          with_minus_signs(fmt::format("{} samples  ·  RMS {:.2f} {}  ·  crest factor {:.2f} dB",
                                       measured.levels.samples, measured.levels.rms_db + command.outputs.calibration_db,
                                       command.outputs.level_unit(), measured.levels.crest_db));
    if (command.envelope)
      envelopes.push_back(envelope_of(command, source, measured));
    else
      shares.push_back({source.name, measured.above_db, measured.probability, !source.format.is_complex});
  }
  if (sources.size() > 1) settings.clear();
  if (files.plot)
    draw(command.envelope
             ? envelope_script(title_of(sources), settings, command.outputs.level_unit(), envelopes, files.type)
             : ccdf_script(title_of(sources), settings, shares, files.type),
         files.type, *files.plot);
  add_output_lines(given, command.outputs);
  return given;
}

}  // namespace

void add_level(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<level_command>();
  CLI::App *app = add_command(program, "level", "RMS, peak, crest factor, DC, clipping and power statistics");
  app->footer(
      "Levels are those of |x|: a complex tone of amplitude 1 has 0 dBFS. Power statistics (CCDF) are the share of "
      "samples whose power is more than some decibels above the mean. Clipped samples have a part at an end of their "
      "type's range. The peak's index counts from --start.");
  add_inputs(*app, command->inputs);
  app->add_flag("--envelope", command->envelope, "Write and draw levels over time instead of the power statistics");
  add_outputs(
      *app, command->outputs,
      {"Write the power statistics, or the envelope", "Draw the power statistics, or the envelope", true, false});
  app->callback([command, &work] { work = [command] { return run(*command); }; });
}

}  // namespace tool
