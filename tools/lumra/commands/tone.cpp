// lumra tone: a carrier, its harmonics, its image, and the noise. SPDX-License-Identifier: MIT
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

struct tone_command {
  input_arguments inputs;
  spectrum_arguments spectrum{.usual_size = 65536, .window = "blackmanharris7"};
  output_arguments outputs;
  std::optional<double> at_hz;
  std::uint32_t harmonics = 5;
};

/// The highest order is the option's; the first is the carrier.
std::size_t order_of(std::size_t index) {
  return index + 2;
}

lumra::tone_figures measure(const tone_command &command, const recording::source &source,
                            const lumra::averaged_spectrum &spectrum) {
  const double low = spectrum.frequency(0), high = spectrum.frequency(spectrum.power.size() - 1);
  if (command.at_hz && !(*command.at_hz >= low && *command.at_hz <= high))
    throw failure("{}: --at {} lies outside of the band, {} to {}", source.data.string(), exact_text(*command.at_hz),
                  frequency_text(low, spectrum.info.spacing_hz), frequency_text(high, spectrum.info.spacing_hz));
  return lumra::measure_tone(spectrum.power, spectrum.info, command.at_hz, command.harmonics);
}

ordered_json json_of(const tone_command &command, const lumra::tone_figures &tone) {
  ordered_json object = {{"frequency_hz", json_number(tone.frequency_hz)},
                         {"level_db", json_number(decibels(tone.power) + command.outputs.calibration_db)},
                         {"snr_db", json_number(tone.snr_db)},
                         {"sinad_db", json_number(tone.sinad_db)},
                         {"thd_db", json_number(tone.thd_db)},
                         {"sfdr_db", json_number(tone.sfdr_db)},
                         {"image_db", json_number(tone.image_db)},
                         {"dc_db", json_number(tone.dc_db)},
                         {"enob", json_number(tone.enob)},
                         {"harmonics", ordered_json::array()}};
  for (std::size_t i = 0; i < tone.harmonics.size(); ++i)
    object["harmonics"].push_back({{"order", order_of(i)},
                                   {"frequency_hz", json_number(tone.harmonics[i].frequency_hz)},
                                   {"level_dbc", json_number(tone.harmonics[i].level_dbc)}});
  return object;
}

void write_csv(output_file &csv, const tone_command &command, const recording::source &source,
               const lumra::tone_figures &tone) {
  const std::string name = command.inputs.paths.size() > 1 ? csv_text(source.path.string()) + "," : "";
  csv.print("{}1,{},{}\n", name, tone.frequency_hz, tone.power > 0 ? "0.0000" : "");
  for (std::size_t i = 0; i < tone.harmonics.size(); ++i)
    csv.print("{}{},{},{}\n", name, order_of(i), tone.harmonics[i].frequency_hz,
              csv_number(tone.harmonics[i].level_dbc));
}

std::string decibel_text(double value, const char *unit) {
  return std::isnan(value) ? "cannot be told" : fmt::format("{:.2f} {}", value, unit);
}

void summarise(results &shown, const tone_command &command, const lumra::tone_figures &tone, double spacing_hz) {
  if (!(tone.power > 0)) return shown.add_line("Carrier", "none: all samples are zero");
  const auto place = [&](double hertz) { return frequency_text(hertz, spacing_hz / 100); };
  shown.add_line("Carrier",
                 fmt::format("{} at {}", level_text(decibels(tone.power), command.outputs), place(tone.frequency_hz)));
  shown.add_line("SNR", decibel_text(tone.snr_db, "dB"));
  shown.add_line("SINAD", fmt::format("{}, {:.2f} effective bits", decibel_text(tone.sinad_db, "dB"), tone.enob));
  shown.add_line("THD", decibel_text(tone.thd_db, "dBc"));
  shown.add_line("SFDR", fmt::format("{}, at {}", decibel_text(tone.sfdr_db, "dB"), place(tone.spur_hz)));
  shown.add_line("Image", decibel_text(tone.image_db, "dBc"));
  shown.add_line("DC", decibel_text(tone.dc_db, "dBc"));
  for (std::size_t i = 0; i < tone.harmonics.size(); ++i)
    shown.add_line(fmt::format("Harmonic {}", order_of(i)),
                   fmt::format("{} at {}", decibel_text(tone.harmonics[i].level_dbc, "dBc"),
                               place(tone.harmonics[i].frequency_hz)));
}

/// The bin of a line, for its mark.
double level_at(const lumra::averaged_spectrum &spectrum, double hertz) {
  const double bin = std::round((hertz - spectrum.frequency(0)) / spectrum.info.spacing_hz);
  const double last = static_cast<double>(spectrum.power.size() - 1);
  return decibels(spectrum.power[static_cast<std::size_t>(std::clamp(bin, 0.0, last))]);
}

void add_marks(spectrum_picture &picture, const tone_command &command, const lumra::tone_figures &tone,
               const lumra::averaged_spectrum &spectrum) {
  if (!(tone.power > 0)) return;
  const auto add = [&](double hertz, std::string text) {
    picture.marks.push_back({hertz, level_at(spectrum, hertz) + command.outputs.calibration_db, std::move(text)});
  };
  add(tone.frequency_hz, level_text(decibels(tone.power), command.outputs));
  for (std::size_t i = 0; i < std::min<std::size_t>(tone.harmonics.size(), 12); ++i)
    if (!std::isnan(tone.harmonics[i].level_dbc)) add(tone.harmonics[i].frequency_hz, fmt::format("{}", order_of(i)));
  if (!std::isnan(tone.image_db)) add(2 * spectrum.info.centre_hz - tone.frequency_hz, "image");
  if (!std::isnan(tone.dc_db)) add(spectrum.info.centre_hz, "DC");
}

results run(const tone_command &command) {
  const bool named = command.inputs.paths.size() > 1;
  return each_spectrum(
      command.inputs, command.spectrum, command.outputs,
      [&](output_file &csv) { csv.print("{}order,frequency_hz,level_dbc\n", named ? "recording," : ""); },
      [&](const measured_spectrum &of) {
        const lumra::tone_figures tone = measure(command, of.source, of.spectrum);
        summarise(of.given, command, tone, of.spectrum.info.spacing_hz);
        if (of.files.json) write_json(*of.files.json, json_of(command, tone));
        if (of.files.csv) write_csv(*of.files.csv, command, of.source, tone);
        if (!of.picture) return;
        add_curve(*of.picture, command.spectrum, of.source, of.spectrum, all_bins(of.spectrum), {}, command.outputs);
        if (of.picture->is_shared) return;
        add_marks(*of.picture, command, tone, of.spectrum);
        of.picture->settings += with_minus_signs(fmt::format("  ·  SNR {:.1f} dB  ·  THD {:.1f} dB  ·  SFDR {:.1f} dB",
                                                             tone.snr_db, tone.thd_db, tone.sfdr_db));
      });
}

}  // namespace

void add_tone(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<tone_command>();
  CLI::App *app = add_command(program, "tone", "A carrier with its harmonics, image and noise");
  app->footer(
      "THD, image and DC are in dB of the carrier. Harmonics are those of the carrier's offset from the centre, folded "
      "into the band; one that falls on another line cannot be told from it. Effective bits are (SINAD - 1.76) / 6.02, "
      "without correction for full scale.");
  add_inputs(*app, command->inputs);
  app->add_option("--at", command->at_hz, "Measure the line nearest to this frequency (default: the strongest)")
      ->option_text("HZ")
      ->transform(any_number());
  app->add_option("--harmonics", command->harmonics, "Highest order (default 5: orders 2 to 5)")
      ->option_text("N")
      ->transform(whole_number(1, 1000));
  add_spectrum_options(*app, command->spectrum);
  add_outputs(*app, command->outputs, {"Write carrier and harmonics", "Draw the spectrum with its lines marked"});
  app->callback([command, &work] { work = [command] { return run(*command); }; });
}

}  // namespace tool
