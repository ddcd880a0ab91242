// lumra spectrum: averaged power spectrum of a recording as summary, CSV and picture. SPDX-License-Identifier: MIT
#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <map>
#include <memory>

#include "analysis/averaged_spectrum.hpp"
#include "commands/arguments.hpp"
#include "commands/commands.hpp"
#include "pictures/gnuplot.hpp"
#include "pictures/spectrum_picture.hpp"
#include "recording/open.hpp"
#include "terminal/failure.hpp"
#include "terminal/output_file.hpp"
#include "terminal/progress.hpp"
#include "terminal/results.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

constexpr std::int32_t default_fft_size = 4096;

struct spectrum_command {
  std::string path;
  recording::options options;
  spectrum_settings settings;
  std::string csv, plot;
};

const char *name_of(lumra::window window) {
  return window == lumra::window::none ? "no window" : "flat top";
}

/// N when none was asked for: the largest power of two that fits, up to a size that suits a screen.
std::int32_t fitting_size(std::uint64_t samples) {
  std::int32_t size = default_fft_size;
  while (size > 16 && static_cast<std::uint64_t>(size) > samples) size /= 2;
  return size;
}

void write_csv(output_file &csv, const averaged_spectrum &spectrum, double centre) {
  progress bar("Writing CSV");
  csv.print("frequency_hz,level_dbfs\n");
  const std::size_t bins = spectrum.power.size();
  for (std::size_t k = 0; k < bins; ++k) {
    csv.print("{},{:.4f}\n", centre + spectrum.offset(k), decibels(spectrum.power[k]));
    if (k % 65536 == 0) bar.update(k, bins);
  }
}

void summarise(results &shown, const spectrum_command &command, const recording::source &source,
               const recording::stretch &over, const averaged_spectrum &spectrum, std::size_t peak) {
  const double rbw = spectrum.resolution_bandwidth();
  shown.add_line("Recording", fmt::format("{} ({})", source.data.string(), source.format.name()));
  shown.add_line("Samples",
                 fmt::format("{} ({:.6g} s)", over.samples, static_cast<double>(over.samples) / source.rate));
  shown.add_line("Sample rate", exact_text(source.rate));
  shown.add_line("Centre frequency", source.frequency ? exact_text(*source.frequency) : "unknown, taken as 0 Hz");
  shown.add_line("FFT size", fmt::format("N = {} (bin spacing {:.6g} Hz)", spectrum.power.size(), spectrum.df));
  shown.add_line("Window", fmt::format("{} (noise bandwidth {:.4f} bins)", name_of(command.settings.window),
                                       spectrum.noise_bandwidth));
  shown.add_line("Averaged",
                 fmt::format("{} segments, overlap {:g} %", spectrum.segments, command.settings.overlap_percent));
  shown.add_line("Resolution bandwidth",
                 fmt::format("{:.6g} Hz (density in dBFS/Hz = level {:+.2f} dB)", rbw, -10 * std::log10(rbw)));
  const double offset = spectrum.offset(peak);
  const double centre = source.frequency.value_or(0);
  std::string where = frequency_text(centre + offset, spectrum.df);
  if (source.frequency) where += fmt::format(" (offset {})", offset_text(offset, spectrum.df, unit_for(offset)));
  shown.add_line("Peak", spectrum.power[peak] > 0
                             ? fmt::format("{:.2f} dBFS at {}", decibels(spectrum.power[peak]), where)
                             : "none: all samples are zero");
  if (spectrum.power[peak] > 1.01)
    shown.add_line("Note", "samples exceed full scale (amplitude 1.0), as unscaled floating-point recordings do");
  if (!command.csv.empty()) shown.add_line("CSV", command.csv);
  if (!command.plot.empty()) shown.add_line("Picture", command.plot);
}

results run(spectrum_command &command) {
  const recording::source source = recording::open(command.path, command.options);
  const recording::stretch &over = recording::only_stretch(source, command.options.names);
  if (command.settings.fft_size == 0) command.settings.fft_size = fitting_size(over.samples);

  // Made first, so that an output that cannot be written is known before the work.
  results given(source.files);
  output_file *const csv = command.csv.empty() ? nullptr : &given.add_file(command.csv);
  const picture_type type = command.plot.empty() ? picture_type::png : picture_type_of(command.plot);
  output_file *const plot = command.plot.empty() ? nullptr : &given.add_file(command.plot);

  const averaged_spectrum spectrum = average_spectrum(source, over, command.settings);
  const auto peak =
      static_cast<std::size_t>(std::max_element(spectrum.power.begin(), spectrum.power.end()) - spectrum.power.begin());
  if (csv) write_csv(*csv, spectrum, source.frequency.value_or(0));
  if (plot) {
    const std::string settings =
        fmt::format("N = {}  ·  {}  ·  {:g} % overlap  ·  {} averaged  ·  RBW {:.4g} {}", spectrum.power.size(),
                    name_of(command.settings.window), command.settings.overlap_percent, spectrum.segments,
                    spectrum.resolution_bandwidth() / unit_for(spectrum.resolution_bandwidth()).hertz,
                    unit_for(spectrum.resolution_bandwidth()).name);
    draw(spectrum_script(source, spectrum, peak, settings, type), type, *plot);
  }
  summarise(given, command, source, over, spectrum, peak);
  return given;
}

}  // namespace

void add_spectrum(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<spectrum_command>();
  CLI::App *app = program.add_subcommand("spectrum", "Averaged power spectrum of a recording, in dB of full scale");
  app->add_option("RECORDING", command->path, "SigMF recording (either file, or their common name) or raw file")
      ->required();
  app->add_option("--fft", command->settings.fft_size, "FFT size N, 16 to 2^27 (default 4096, or less if it must fit)")
      ->option_text("N")
      ->check(CLI::Range(16, 1 << 27));
  const std::map<std::string, lumra::window> windows{{"none", lumra::window::none},
                                                     {"flattop", lumra::window::flat_top}};
  app->add_option("--window", command->settings.window, "none or flattop (default)")
      ->option_text("NAME")
      ->transform(CLI::Transformer(windows))
      ->transform(CLI::IsMember(windows));
  app->add_option("--overlap", command->settings.overlap_percent, "Overlap of the segments (default 50)")
      ->option_text("PERCENT")
      ->check(number_where("at least 0 and below 100", [](double value) { return value >= 0 && value < 100; }));
  app->add_option("--csv", command->csv, "Write frequency and level of every bin")->option_text("FILE");
  app->add_option("--plot", command->plot, "Draw the spectrum")->option_text("FILE.png|.svg");
  add_recording_options(*app, command->options);
  // Tests alone use this option: how much is read at a time must not change the result.
  app->add_option("--block", command->settings.block)->group("")->check(CLI::Range(1, 1 << 27));
  app->callback([command, &work] { work = [command] { return run(*command); }; });
}

}  // namespace tool
