// lumra power: powers of channels, of their neighbours, and the occupied bandwidth. SPDX-License-Identifier: MIT
#include <fmt/core.h>

#include <cmath>
#include <lumra/measure.hpp>
#include <memory>
#include <nlohmann/json.hpp>

#include "commands/arguments.hpp"
#include "commands/commands.hpp"
#include "commands/each_spectrum.hpp"
#include "commands/inputs.hpp"
#include "commands/spectrum_options.hpp"
#include "pictures/spectrum_picture.hpp"
#include "terminal/failure.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

using nlohmann::ordered_json;

struct channel {
  double centre_hz, bandwidth_hz;
};

struct power_command {
  input_arguments inputs;
  spectrum_arguments spectrum;
  output_arguments outputs;
  std::vector<std::string> channel_texts;
  std::string adjacent_text;
  double occupied_percent = 99;

  std::vector<channel> channels;  // none: the whole band
  std::vector<double> offsets_hz;
};

struct channel_figures {
  channel where;
  double power_db, density_db_hz;
  std::vector<lumra::adjacent> adjacent;
};

struct power_figures {
  std::vector<channel_figures> channels;
  lumra::frequency_band occupied;
};

void parse(power_command &command) {
  for (const std::string &text : command.channel_texts) {
    const std::vector<double> numbers = parse_numbers("--channel", text, ':');
    if (numbers.size() != 2 || !(numbers[1] > 0))
      throw wrong_usage("--channel: '{}' is not CENTER:BANDWIDTH with a bandwidth above 0", text);
    command.channels.push_back({numbers[0], numbers[1]});
  }
  if (command.adjacent_text.empty()) return;
  command.offsets_hz = parse_numbers("--adjacent", command.adjacent_text, ',');
  for (const double offset : command.offsets_hz)
    if (!(offset > 0)) throw wrong_usage("--adjacent: '{}' holds an offset that is not above 0", command.adjacent_text);
}

channel whole_band(const lumra_spectrum_info &info) {
  if (info.sides == 2) return {info.centre_hz, info.sample_rate_hz};
  return {info.centre_hz + info.sample_rate_hz / 4, info.sample_rate_hz / 2};
}

power_figures measure(const power_command &command, const recording::source &source,
                      const lumra::averaged_spectrum &spectrum) {
  const channel band = whole_band(spectrum.info);
  const double added = command.outputs.calibration_db;
  power_figures figures;
  for (const channel &where : command.channels.empty() ? std::vector{band} : command.channels) {
    // What the edges of the band let in by rounding is the library's to say.
    constexpr double rounding = 1e-9;
    const double beyond = std::abs(where.centre_hz - band.centre_hz) + (where.bandwidth_hz - band.bandwidth_hz) / 2;
    if (beyond > rounding * band.bandwidth_hz)
      throw failure("{}: the channel of {} around {} reaches beyond the band, {} to {}", source.data.string(),
                    exact_text(where.bandwidth_hz), exact_text(where.centre_hz),
                    exact_text(band.centre_hz - band.bandwidth_hz / 2),
                    exact_text(band.centre_hz + band.bandwidth_hz / 2));
    const double power = lumra::channel_power(spectrum.power, spectrum.info, where.centre_hz, where.bandwidth_hz);
    const double level = decibels(power) + added;
    figures.channels.push_back({where, level, level - decibels(where.bandwidth_hz), {}});
    if (!command.offsets_hz.empty())
      figures.channels.back().adjacent =
          lumra::adjacent_power(spectrum.power, spectrum.info, where.centre_hz, where.bandwidth_hz, command.offsets_hz);
  }
  figures.occupied = lumra::occupied_bandwidth(spectrum.power, spectrum.info, command.occupied_percent / 100);
  return figures;
}

ordered_json json_of(const power_command &command, const power_figures &figures) {
  ordered_json object;
  object["channels"] = ordered_json::array();
  for (const channel_figures &each : figures.channels) {
    ordered_json adjacent = ordered_json::array();
    for (std::size_t i = 0; i < each.adjacent.size(); ++i)
      adjacent.push_back({{"offset_hz", command.offsets_hz[i]},
                          {"lower_dbc", json_number(each.adjacent[i].lower_dbc)},
                          {"upper_dbc", json_number(each.adjacent[i].upper_dbc)}});
    object["channels"].push_back({{"center_hz", each.where.centre_hz},
                                  {"bandwidth_hz", each.where.bandwidth_hz},
                                  {"power_db", json_number(each.power_db)},
                                  {"density_db_hz", json_number(each.density_db_hz)},
                                  {"adjacent", std::move(adjacent)}});
  }
  const auto &[low, high] = figures.occupied;
  object["occupied"] = {{"percent", command.occupied_percent},
                        {"low_hz", json_number(low)},
                        {"high_hz", json_number(high)},
                        {"bandwidth_hz", json_number(high - low)}};
  return object;
}

void write_csv_header(output_file &csv, const power_command &command) {
  const char *unit = command.outputs.level_column();
  csv.print("{}center_hz,bandwidth_hz,power_{},density_{}_hz", command.inputs.paths.size() > 1 ? "recording," : "",
            unit, unit);
  for (const double offset : command.offsets_hz) csv.print(",lower_{0:.12g}_dbc,upper_{0:.12g}_dbc", offset);
  csv.print("\n");
}

void write_csv(output_file &csv, const power_command &command, const recording::source &source,
               const power_figures &figures) {
  for (const channel_figures &each : figures.channels) {
    if (command.inputs.paths.size() > 1) csv.print("{},", csv_text(source.path.string()));
    csv.print("{},{},{},{}", each.where.centre_hz, each.where.bandwidth_hz, csv_number(each.power_db),
              csv_number(each.density_db_hz));
    for (const lumra::adjacent &beside : each.adjacent)
      csv.print(",{},{}", csv_number(beside.lower_dbc), csv_number(beside.upper_dbc));
    csv.print("\n");
  }
}

std::string dbc_text(double level) {
  return std::isnan(level) ? "beyond the band" : fmt::format("{:.2f} dBc", level);
}

std::string occupied_text(const power_command &command, const power_figures &figures) {
  const auto &[low, high] = figures.occupied;
  return fmt::format("{:g} % of the power in {}", command.occupied_percent, short_text(high - low));
}

void summarise(results &shown, const power_command &command, const power_figures &figures, double spacing_hz) {
  const char *unit = command.outputs.level_unit();
  for (const channel_figures &each : figures.channels) {
    shown.add_line("Channel",
                   fmt::format("{} around {}: {:.2f} {}, {:.2f} {}/Hz", exact_text(each.where.bandwidth_hz),
                               exact_text(each.where.centre_hz), each.power_db, unit, each.density_db_hz, unit));
    for (std::size_t i = 0; i < each.adjacent.size(); ++i)
      shown.add_line("  neighbours",
                     fmt::format("at {}: lower {}, upper {}", exact_text(command.offsets_hz[i]),
                                 dbc_text(each.adjacent[i].lower_dbc), dbc_text(each.adjacent[i].upper_dbc)));
  }
  const auto &[low, high] = figures.occupied;
  shown.add_line("Occupied bandwidth",
                 std::isnan(low) ? "none: all samples are zero"
                                 : fmt::format("{}, {} to {}", occupied_text(command, figures),
                                               frequency_text(low, spacing_hz), frequency_text(high, spacing_hz)));
}

void add_stretches(spectrum_picture &picture, const power_command &command, const power_figures &figures) {
  const char *unit = command.outputs.level_unit();
  for (const channel_figures &each : figures.channels) {
    const auto add = [&](double offset, std::string text) {
      const double centre = each.where.centre_hz + offset;
      picture.stretches.push_back(
          {centre - each.where.bandwidth_hz / 2, centre + each.where.bandwidth_hz / 2, std::move(text), false});
    };
    add(0, fmt::format("{:.2f} {}", each.power_db, unit));
    for (std::size_t i = 0; i < each.adjacent.size(); ++i) {
      const auto &[lower, upper] = each.adjacent[i];
      if (!std::isnan(lower)) add(-command.offsets_hz[i], dbc_text(lower));
      if (!std::isnan(upper)) add(command.offsets_hz[i], dbc_text(upper));
    }
  }
  if (!std::isnan(figures.occupied.low_hz))
    picture.stretches.push_back(
        {figures.occupied.low_hz, figures.occupied.high_hz, occupied_text(command, figures), true});
}

results run(const power_command &command) {
  return each_spectrum(
      command.inputs, command.spectrum, command.outputs, [&](output_file &csv) { write_csv_header(csv, command); },
      [&](const measured_spectrum &of) {
        const power_figures figures = measure(command, of.source, of.spectrum);
        summarise(of.given, command, figures, of.spectrum.info.spacing_hz);
        if (of.files.json) write_json(*of.files.json, json_of(command, figures));
        if (of.files.csv) write_csv(*of.files.csv, command, of.source, figures);
        if (!of.picture) return;
        add_curve(*of.picture, command.spectrum, of.source, of.spectrum, all_bins(of.spectrum), {}, command.outputs);
        if (!of.picture->is_shared) add_stretches(*of.picture, command, figures);
      });
}

}  // namespace

void add_power(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<power_command>();
  CLI::App *app = add_command(program, "power", "Powers of channels and their neighbours, occupied bandwidth");
  app->footer(
      "Powers are integrated over the averaged spectrum and divided by the noise bandwidth of its window. Neighbours "
      "are as wide as their channel, at these distances from centre to centre.");
  add_inputs(*app, command->inputs);
  app->add_option("--channel", command->channel_texts,
                  "A channel by centre and width in hertz; may be repeated (default: the whole band)")
      ->option_text("CENTER:BANDWIDTH")
      ->allow_extra_args(false);
  app->add_option("--adjacent", command->adjacent_text, "Distances of neighbouring channels")
      ->option_text("OFFSET[,OFFSET...]");
  app->add_option("--occupied", command->occupied_percent, "Share of the power in the occupied bandwidth (default 99)")
      ->option_text("PERCENT")
      ->transform(number_where("above 0 and at most 100", [](double x) { return x > 0 && x <= 100; }));
  add_spectrum_options(*app, command->spectrum);
  add_outputs(*app, command->outputs, {"Write the powers of each channel", "Draw the spectrum with the channels"});
  app->callback([command, &work] {
    parse(*command);
    work = [command] { return run(*command); };
  });
}

}  // namespace tool
