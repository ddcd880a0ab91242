// lumra evm: the errors of a measured recording against a reference as summary, CSV and picture.
// SPDX-License-Identifier: MIT
#include <fmt/core.h>

#include <algorithm>
#include <cmath>
#include <iterator>
#include <memory>
#include <nlohmann/json.hpp>
#include <numbers>

#include "analysis/evm_measurement.hpp"
#include "commands/arguments.hpp"
#include "commands/commands.hpp"
#include "commands/inputs.hpp"
#include "documentation/command_model.hpp"
#include "pictures/constellation_picture.hpp"
#include "recording/open.hpp"
#include "terminal/failure.hpp"
#include "terminal/output_file.hpp"
#include "terminal/results.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

struct evm_command {
  std::string reference, measured;
  recording::options reference_options, measured_options;
  evm_settings settings;
  std::string align_text;
  output_arguments outputs;
};

struct alignment {
  const char *name;
  std::uint32_t flag;
};
constexpr alignment alignments[] = {{"gain", LUMRA_ALIGN_GAIN},
                                    {"delay", LUMRA_ALIGN_DELAY},
                                    {"frequency", LUMRA_ALIGN_FREQUENCY},
                                    {"dc", LUMRA_ALIGN_DC}};

/// What a list of names between commas asks for; nothing where there is another name.
std::optional<std::uint32_t> parse_align(std::string_view text) {
  std::uint32_t align = 0;
  for (;;) {
    const std::size_t end = std::min(text.find(','), text.size());
    const auto *found = std::find_if(std::begin(alignments), std::end(alignments),
                                     [&](const alignment &each) { return text.substr(0, end) == each.name; });
    if (found == std::end(alignments)) return std::nullopt;
    align |= found->flag;
    if (end == text.size()) return align;
    text.remove_prefix(end + 1);
  }
}

constexpr double degrees = 180 / std::numbers::pi;

double level(double ratio) {
  return 20 * std::log10(ratio);
}

std::string ratio_text(double ratio) {
  return fmt::format("{:.6g} % ({:.2f} dB)", 100 * ratio, level(ratio));
}

std::string place_text(std::uint64_t index, double rate) {
  return fmt::format("at sample {} ({:.9g} s)", index, static_cast<double>(index) / rate);
}

std::string deviation_text(const deviation &of, double factor, const char *unit, double rate) {
  return fmt::format("RMS {:.6g} {}, peak {:+.6g} {} {}, mean {:+.6g} {}", factor * of.rms, unit, factor * of.peak,
                     unit, place_text(of.peak_at, rate), factor * of.mean, unit);
}

/// How many samples are compared.
std::uint64_t common_samples(const evm_input &first, const evm_input &second, std::uint64_t wanted) {
  const recording::source &reference = first.source, &measured = second.source;
  if (reference.rate != measured.rate)
    throw failure("{} was sampled at {}, {} at {}; resample one of them, or say --rate if the metadata are wrong",
                  reference.data.string(), exact_text(reference.rate), measured.data.string(),
                  exact_text(measured.rate));
  for (const evm_input *input : {&first, &second})
    if (input->over.samples < wanted)
      throw failure("{}: {} samples are fewer than {}; use a smaller --samples", input->source.data.string(),
                    input->over.samples, wanted);
  if (wanted == 0 && first.over.samples != second.over.samples)
    throw failure("{} has {} samples, {} has {}; cut them to the same part, or compare the first N with --samples N",
                  reference.data.string(), first.over.samples, measured.data.string(), second.over.samples);
  return wanted > 0 ? wanted : first.over.samples;
}

void write_rows(output_file &csv, const evm_block &block) {
  const double percent = 100 / block.unit;
  for (std::size_t i = 0; i < block.error.size(); ++i) {
    csv.print("{},{:.7g},{:.7g},", block.first + i, percent * block.error[i], percent * block.magnitude[i]);
    if (has_phase(block.reference[i], block.measured[i]))
      csv.print("{:.7g}\n", degrees * block.phase[i]);
    else
      csv.print("\n");
  }
}

void collect(constellation &points, const evm_block &block) {
  while (points.next() - block.place < block.error.size()) {
    const std::uint64_t i = points.next() - block.place;
    points.add(std::complex<double>(block.reference[i]) / block.unit,
               std::complex<double>(block.measured[i]) / block.unit);
  }
}

std::string gain_text(std::complex<double> gain, int decimals, const char *unit) {
  return fmt::format("{:+.{}f} dB, {:+.{}f}{}", level(std::abs(gain)), decimals, degrees * std::arg(gain), decimals,
                     unit);
}

bool asks_for(const evm_command &command, std::uint32_t flag) {
  return (command.settings.align & flag) != 0;
}

/// What was found of the alignment, behind the name of each part.
std::string alignment_text(const evm_command &command, const evm_result &result) {
  std::string text;
  const auto add = [&](std::uint32_t flag, const std::string &part) {
    if (asks_for(command, flag)) text += (text.empty() ? "" : ", ") + part;
  };
  add(LUMRA_ALIGN_GAIN, "complex gain " + gain_text(result.gain, 4, " deg"));
  add(LUMRA_ALIGN_DELAY, fmt::format("delay {:.6g} samples", result.delay_samples));
  add(LUMRA_ALIGN_FREQUENCY, fmt::format("frequency {:.6g} Hz", result.frequency_hz));
  add(LUMRA_ALIGN_DC, fmt::format("DC {:.2f} dBFS", level(std::abs(result.dc))));
  return text.empty() ? "none; a difference in gain or phase is an error (see --align)"
                      : "least-squares " + text + ", removed";
}

void summarise(results &shown, const evm_command &command, const evm_input &first, const evm_input &second,
               const evm_result &result) {
  const recording::source &reference = first.source, &measured = second.source;
  const double rate = reference.rate;
  const auto name = [](const recording::source &r) { return fmt::format("{} ({})", r.data.string(), r.datatype); };
  shown.add_line("Reference", name(reference));
  shown.add_line("Measured", name(measured));
  std::string length = fmt::format("{} ({:.6g} s)", result.samples, static_cast<double>(result.samples) / rate);
  if (result.first > 0)
    length += fmt::format(", from number {} on", result.first);
  else if (result.samples < first.over.samples || result.samples < second.over.samples)
    length += fmt::format(", the first of {} and {}", first.over.samples, second.over.samples);
  shown.add_line("Samples", length);
  shown.add_line("Sample rate", exact_text(rate));
  shown.add_line("Reference level", fmt::format("{:.2f} dBFS RMS, which is 100 %", level(result.reference_rms)));
  shown.add_line("Alignment", alignment_text(command, result));
  shown.add_line("EVM RMS", ratio_text(result.error.rms));
  shown.add_line("EVM peak", ratio_text(result.error.peak) + " " + place_text(result.error.peak_at, rate));
  shown.add_line("Magnitude error", deviation_text(result.magnitude, 100, "%", rate));
  shown.add_line("Phase error", result.without_phase == result.samples
                                    ? "none: each sample is zero in one of the recordings"
                                    : deviation_text(result.phase, degrees, "deg", rate));
  if (result.without_phase > 0 && result.without_phase < result.samples)
    shown.add_line("Note",
                   fmt::format("{} samples are zero in one of the recordings and are no part of the phase error",
                               result.without_phase));
}

nlohmann::ordered_json json_of(const evm_command &command, const evm_result &result) {
  const auto asked = [&](std::uint32_t flag, double value) {
    return asks_for(command, flag) ? json_number(value) : nlohmann::ordered_json();
  };
  return {{"samples", result.samples},
          {"evm_rms_percent", 100 * result.error.rms},
          {"evm_peak_percent", 100 * result.error.peak},
          {"evm_rms_db", json_number(level(result.error.rms))},
          {"magnitude_rms_percent", 100 * result.magnitude.rms},
          {"phase_rms_deg",
           result.without_phase == result.samples ? nlohmann::ordered_json() : json_number(degrees * result.phase.rms)},
          {"gain_db", asked(LUMRA_ALIGN_GAIN, level(std::abs(result.gain)))},
          {"gain_phase_deg", asked(LUMRA_ALIGN_GAIN, degrees * std::arg(result.gain))},
          {"delay_samples", asked(LUMRA_ALIGN_DELAY, result.delay_samples)},
          {"frequency_hz", asked(LUMRA_ALIGN_FREQUENCY, result.frequency_hz)},
          {"dc_db", asked(LUMRA_ALIGN_DC, level(std::abs(result.dc)))}};
}

results run(evm_command &command) {
  // What is said of both is said once.
  const recording::options &said = command.measured_options;
  recording::options &reference_said = command.reference_options;
  const recording::option_names names = reference_said.names;
  const auto capture = reference_said.capture;
  reference_said = said;
  reference_said.names = names;
  reference_said.capture = capture;
  const recording::source reference = recording::open(command.reference, reference_said);
  const recording::source measured = recording::open(command.measured, said);
  for (const recording::source *source : {&reference, &measured})
    if (!source->ranged) throw failure("{}: is read more than once; save it to a file first", source->data.string());
  const evm_input first{reference, recording::only_stretch(reference, reference_said.names)};
  const evm_input second{measured, recording::only_stretch(measured, said.names)};
  command.settings.samples = common_samples(first, second, command.settings.samples);

  // Made first, so that an output that cannot be written is known before the work.
  results given(files_of({reference, measured}));
  const output_files files = begin_outputs(given, command.outputs);
  constellation points(command.settings.samples);
  if (files.csv) files.csv->print("sample,evm_percent,magnitude_error_percent,phase_error_deg\n");
  const evm_result result = measure_evm(first, second, command.settings, [&](const evm_block &block) {
    if (files.csv) write_rows(*files.csv, block);
    if (files.plot) collect(points, block);
  });
  if (files.plot) {
    std::string figures = fmt::format("EVM {:.4g} % RMS ({:.2f} dB)  ·  {:.4g} % peak", 100 * result.error.rms,
                                      level(result.error.rms), 100 * result.error.peak);
    if (asks_for(command, LUMRA_ALIGN_GAIN)) figures += "  ·  gain " + gain_text(result.gain, 2, "°") + " removed";
    draw(constellation_script(points, measured.name + " against " + reference.name, figures, files.type), files.type,
         *files.plot);
  }
  summarise(given, command, first, second, result);
  if (files.json) write_json(*files.json, json_of(command, result));
  add_output_lines(given, command.outputs);
  return given;
}

}  // namespace

void add_evm(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<evm_command>();
  CLI::App *app = add_command(program, "evm", "Error vectors of a recording against a reference");
  app->footer(
      "Sample by sample, M against R: EVM = |M - R|, magnitude error = |M| - |R|, both in percent of the RMS of the "
      "reference; phase error = arg(M conj(R)) in degrees, for samples that are zero in neither recording. --align "
      "first "
      "finds by least squares, and removes, what of M[n] = g R[n - delay] exp(2 pi j frequency n / rate) + dc is asked "
      "for; a positive delay means that MEASURED is late.");
  app->add_option("REFERENCE", command->reference, recording_help)->required();
  app->add_option("MEASURED", command->measured, "What is compared with it, sample by sample")->required();
  with_choices(app->add_option("--align", command->align_text,
                               "What to find and remove first, of gain, delay, frequency and dc, between commas; gain "
                               "unless said")
                   ->option_text("LIST")
                   ->check(CLI::Validator(
                       [](std::string &text) {
                         return parse_align(text)
                                    ? std::string()
                                    : fmt::format("'{}' is no list of gain, delay, frequency and dc", text);
                       },
                       "")),
               {"gain", "delay", "frequency", "dc", "gain,delay,frequency,dc"});
  app->add_option("--samples", command->settings.samples, "Compare the first N samples alone")
      ->option_text("N")
      ->transform(whole_number(1, std::uint64_t{1} << 62));
  add_recording_options(*app, command->measured_options);
  add_capture_option(*app, command->measured_options, capture_help);
  command->reference_options.names.capture = "--reference-capture";
  add_capture_option(*app, command->reference_options, "The same of REFERENCE; --capture is for MEASURED");
  add_outputs(*app, command->outputs, {"Write the errors of every sample", "Draw the constellation", false, false});
  // Tests alone use this option: how much is read at a time must not change the result.
  app->add_option("--block", command->settings.block)->group("")->check(CLI::Range(1, 1 << 27));
  app->callback([command, &work] {
    if (!command->align_text.empty()) command->settings.align = *parse_align(command->align_text);
    work = [command] { return run(*command); };
  });
}

void complete_align(std::vector<std::string> &words) {
  for (std::size_t i = 0; i < words.size() && words[i] != "--"; ++i) {
    if (words[i] != "--align") continue;
    const bool listed = i + 1 < words.size() && parse_align(words[i + 1]);
    words[i] = "--align=" + (listed ? words[i + 1] : "gain");
    if (listed) words.erase(words.begin() + static_cast<std::ptrdiff_t>(i) + 1);
  }
}

}  // namespace tool
