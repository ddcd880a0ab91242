// lumra evm: the errors of a measured recording against a reference as summary, CSV and picture.
// SPDX-License-Identifier: MIT
#include <fmt/format.h>

#include <cmath>
#include <memory>
#include <numbers>

#include "analysis/evm_measurement.hpp"
#include "commands/arguments.hpp"
#include "commands/commands.hpp"
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
  std::string csv, plot;
};

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
  while (points.next() - block.first < block.error.size()) {
    const std::uint64_t i = points.next() - block.first;
    points.add(std::complex<double>(block.reference[i]) / block.unit,
               std::complex<double>(block.measured[i]) / block.unit);
  }
}

std::string gain_text(std::complex<double> gain, int decimals, const char *unit) {
  return fmt::format("{:+.{}f} dB, {:+.{}f}{}", level(std::abs(gain)), decimals, degrees * std::arg(gain), decimals,
                     unit);
}

void summarise(results &shown, const evm_command &command, const evm_input &first, const evm_input &second,
               const evm_result &result) {
  const recording::source &reference = first.source, &measured = second.source;
  const double rate = reference.rate;
  const std::uint64_t samples = command.settings.samples;
  const auto name = [](const recording::source &r) { return fmt::format("{} ({})", r.data.string(), r.format.name()); };
  shown.add_line("Reference", name(reference));
  shown.add_line("Measured", name(measured));
  std::string length = fmt::format("{} ({:.6g} s)", samples, static_cast<double>(samples) / rate);
  if (samples < first.over.samples || samples < second.over.samples)
    length += fmt::format(", the first of {} and {}", first.over.samples, second.over.samples);
  shown.add_line("Samples", length);
  shown.add_line("Sample rate", exact_text(rate));
  shown.add_line("Reference level", fmt::format("{:.2f} dBFS RMS, which is 100 %", level(result.reference_rms)));
  shown.add_line("Alignment", command.settings.align
                                  ? "least-squares complex gain " + gain_text(result.gain, 4, " deg") + ", divided out"
                                  : "none; a difference in gain or phase is an error (see --align)");
  shown.add_line("EVM RMS", ratio_text(result.error.rms));
  shown.add_line("EVM peak", ratio_text(result.error.peak) + " " + place_text(result.error.peak_at, rate));
  shown.add_line("Magnitude error", deviation_text(result.magnitude, 100, "%", rate));
  shown.add_line("Phase error", result.without_phase == samples ? "none: each sample is zero in one of the recordings"
                                                                : deviation_text(result.phase, degrees, "deg", rate));
  if (result.without_phase > 0 && result.without_phase < samples)
    shown.add_line("Note",
                   fmt::format("{} samples are zero in one of the recordings and are no part of the phase error",
                               result.without_phase));
  if (!command.csv.empty()) shown.add_line("CSV", command.csv);
  if (!command.plot.empty()) shown.add_line("Picture", command.plot);
}

results run(evm_command &command) {
  command.reference_options.rate = command.measured_options.rate;
  command.reference_options.format = command.measured_options.format;
  const recording::source reference = recording::open(command.reference, command.reference_options);
  const recording::source measured = recording::open(command.measured, command.measured_options);
  const evm_input first{reference, recording::only_stretch(reference, command.reference_options.names)};
  const evm_input second{measured, recording::only_stretch(measured, command.measured_options.names)};
  command.settings.samples = common_samples(first, second, command.settings.samples);
  std::vector<std::filesystem::path> inputs = reference.files;
  inputs.insert(inputs.end(), measured.files.begin(), measured.files.end());

  // Made first, so that an output that cannot be written is known before the work.
  results given(std::move(inputs));
  output_file *const csv = command.csv.empty() ? nullptr : &given.add_file(command.csv);
  const picture_type type = command.plot.empty() ? picture_type::png : picture_type_of(command.plot);
  output_file *const plot = command.plot.empty() ? nullptr : &given.add_file(command.plot);

  constellation points(command.settings.samples);
  if (csv) csv->print("sample,evm_percent,magnitude_error_percent,phase_error_deg\n");
  const evm_result result = measure_evm(first, second, command.settings, [&](const evm_block &block) {
    if (csv) write_rows(*csv, block);
    if (plot) collect(points, block);
  });
  if (plot) {
    std::string figures = fmt::format("EVM {:.4g} % RMS ({:.2f} dB)  ·  {:.4g} % peak", 100 * result.error.rms,
                                      level(result.error.rms), 100 * result.error.peak);
    if (command.settings.align) figures += "  ·  gain " + gain_text(result.gain, 2, "°") + " removed";
    draw(constellation_script(points, measured.name + " against " + reference.name, figures, type), type, *plot);
  }
  summarise(given, command, first, second, result);
  return given;
}

}  // namespace

void add_evm(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<evm_command>();
  CLI::App *app = program.add_subcommand("evm", "Error vectors of a recording against a reference");
  app->footer(
      "Sample by sample, M against R: EVM = |M - R|, magnitude error = |M| - |R|, both in percent of the RMS of the\n"
      "reference; phase error = arg(M conj(R)) in degrees, for samples that are zero in neither recording. With\n"
      "--align, M is first divided by the gain g that minimises the sum of |M - g R|^2.");
  app->add_option("REFERENCE", command->reference, "SigMF recording (either file, or their common name) or raw file")
      ->required();
  app->add_option("MEASURED", command->measured, "What is compared with it, sample by sample")->required();
  app->add_flag("--align", command->settings.align, "Divide MEASURED by the one complex gain of least squares first");
  app->add_option("--samples", command->settings.samples, "Compare the first N samples alone")
      ->option_text("N")
      ->check(CLI::Range(std::uint64_t{1}, std::uint64_t{1} << 62));
  app->add_option("--csv", command->csv, "Write the errors of every sample")->option_text("FILE");
  app->add_option("--plot", command->plot, "Draw the constellation")->option_text("FILE.png|.svg");
  add_recording_options(*app, command->measured_options);
  command->reference_options.names.capture = "--reference-capture";
  add_capture_option(*app, command->reference_options, "The same of REFERENCE; --capture is for MEASURED");
  // Tests alone use this option: how much is read at a time must not change the result.
  app->add_option("--block", command->settings.block)->group("")->check(CLI::Range(1, 1 << 27));
  app->callback([command, &work] { work = [command] { return run(*command); }; });
}

}  // namespace tool
