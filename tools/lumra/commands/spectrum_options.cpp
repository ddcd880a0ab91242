// SPDX-License-Identifier: MIT
#include "commands/spectrum_options.hpp"

#include <fmt/core.h>

#include <algorithm>
#include <cmath>
#include <limits>
#include <lumra/measure.hpp>
#include <lumra/window.hpp>
#include <nlohmann/json.hpp>

#include "analysis/spectrum_accumulator.hpp"
#include "analysis/spectrum_pieces.hpp"
#include "documentation/command_model.hpp"
#include "terminal/failure.hpp"
#include "terminal/progress.hpp"
#include "terminal/units.hpp"

namespace tool {

using nlohmann::ordered_json;

namespace {

constexpr std::uint64_t smallest_size = 16, largest_size = std::uint64_t{1} << 27;

const std::vector<std::string> windows{"none",           "hann",
                                       "hamming",        "blackman",
                                       "exact_blackman", "blackmanharris3",
                                       "blackmanharris", "blackmanharris7",
                                       "nuttall",        "low_sidelobe",
                                       "flattop",        "flattop_toolkit"};

std::string window_names() {
  std::string names;
  for (const std::string &name : windows) names += name + ", ";
  return names;
}

CLI::Validator window_name() {
  return {[](std::string &text) {
            std::int32_t type = 0;
            double parameter = 0;
            return lumra_window_by_name(text.c_str(), &type, &parameter) == LUMRA_SUCCESS
                       ? std::string()
                       : fmt::format("'{}' is none of {}kaiser:BETA with BETA to 700", text, window_names());
          },
          ""};
}

/// The smallest N whose resolution bandwidth is not above what is asked for.
std::uint64_t size_for(const spectrum_arguments &arguments, double rate, const recording::source &source) {
  const lumra::window_shape window(arguments.window);
  const auto bandwidth = [&](std::uint64_t n) {
    return lumra::window_figures(window, n).noise_bandwidth_bins * rate / static_cast<double>(n);
  };
  // The width in bins hardly depends on N.
  const double estimate = std::ceil(lumra::window_figures(window, 4096).noise_bandwidth_bins * rate / arguments.rbw_hz);
  if (!(estimate <= static_cast<double>(largest_size)))
    throw failure("{}: a resolution bandwidth of {} needs N = {:.0f}, above 2^27; use a larger --rbw",
                  source.data.string(), short_text(arguments.rbw_hz), estimate);
  constexpr double rounding = 1e-12;
  const double widest = arguments.rbw_hz * (1 + rounding);
  std::uint64_t n = std::max(static_cast<std::uint64_t>(estimate), smallest_size);
  while (n > smallest_size && bandwidth(n - 1) <= widest) --n;
  while (bandwidth(n) > widest) ++n;
  return n;
}

}  // namespace

void add_spectrum_options(CLI::App &app, spectrum_arguments &arguments) {
  auto *fft =
      app.add_option("--fft", arguments.fft_size,
                     fmt::format("FFT size N, 16 to 2^27 (default {}, or less if it must fit)", arguments.usual_size))
          ->option_text("N")
          ->transform(whole_number(smallest_size, largest_size));
  app.add_option("--rbw", arguments.rbw_hz,
                 "Resolution bandwidth: the smallest N whose noise bandwidth is not above this")
      ->option_text("HZ")
      ->transform(positive_number())
      ->excludes(fft);
  with_choices(app.add_option("--window", arguments.window,
                              fmt::format("{}or kaiser:BETA (default {})", window_names(), arguments.window))
                   ->option_text("NAME")
                   ->check(window_name()),
               windows);
  app.add_option("--overlap", arguments.overlap_percent,
                 fmt::format("Overlap of the segments (default {:g})", arguments.overlap_percent))
      ->option_text("PERCENT")
      ->transform(number_where("at least 0 and below 100", [](double value) { return value >= 0 && value < 100; }));
}

lumra::spectrum_settings settings_for(const spectrum_arguments &arguments, const recording::source &source,
                                      const selection &chosen, const output_arguments &outputs) {
  std::uint64_t longest = 0;
  for (const recording::stretch &each : chosen.stretches) longest = std::max(longest, each.samples);
  const lumra::window_shape window(arguments.window);
  lumra::spectrum_settings settings;
  settings.sample_rate_hz = source.rate;
  settings.centre_hz = chosen.frequency.value_or(0);
  settings.window = window.type;
  settings.window_parameter = window.parameter;
  settings.overlap = arguments.overlap_percent / 100;
  settings.hold = arguments.hold;
  settings.threads = outputs.threads;
  settings.points = arguments.fft_size > 0 ? arguments.fft_size : arguments.usual_size;
  if (arguments.rbw_hz > 0) settings.points = size_for(arguments, source.rate, source);
  if (arguments.fft_size == 0 && arguments.rbw_hz == 0)
    while (settings.points > smallest_size && settings.points > longest) settings.points /= 2;
  if (longest < settings.points)
    throw failure("{}: {} samples{} are fewer than N = {}; use a {}", source.data.string(), longest,
                  chosen.stretches.size() > 1 ? " in a row" : "", settings.points,
                  arguments.rbw_hz > 0 ? "larger --rbw" : "smaller --fft");
  return settings;
}

lumra::averaged_spectrum average(const recording::source &source, selection &chosen,
                                 const lumra::spectrum_settings &settings) {
  spectrum_accumulator accumulator(settings, !source.format.is_complex);
  progress bar("Analysing");
  std::uint64_t done = 0;
  const auto add_to_done = [&](std::uint64_t samples) {
    done += samples;
    bar.update(done, chosen.samples == recording::endless ? 0 : chosen.samples);
  };
  if (spectrum_pieces::pay(source, chosen, settings)) {
    spectrum_pieces pieces(source, chosen, settings, spectrum_pieces::usual_size(settings));
    while (const auto piece = pieces.next()) {
      accumulator.merge(piece->average);
      add_to_done(piece->samples);
    }
  } else {
    sample_blocks blocks(source, chosen);
    while (const auto block = blocks.next()) {
      if (block->begins_stretch && done > 0) accumulator.gap();
      accumulator.add(*block);
      add_to_done(block->count);
    }
  }
  chosen.samples = done;
  if (accumulator.segments() == 0)
    throw failure("{}: {} samples are fewer than N = {}; use a smaller --fft", source.data.string(), done,
                  settings.points);
  try {
    return accumulator.read();
  } catch (const failure &reason) {
    throw failure("{}: {}", source.data.string(), reason.what());
  }
}

bin_range all_bins(const lumra::averaged_spectrum &spectrum) {
  return {0, spectrum.power.size()};
}

double decibels(double power) noexcept {
  return 10 * std::log10(power);
}

double total_power(const lumra::averaged_spectrum &spectrum) {
  double sum = 0;
  for (const double power : spectrum.power) sum += power;
  return sum / spectrum.info.noise_bandwidth_bins;
}

std::vector<lumra::peak> highest_peaks(const lumra::averaged_spectrum &spectrum, bin_range bins, std::size_t most) {
  lumra_find_peaks_options options = LUMRA_FIND_PEAKS_OPTIONS;
  options.distance_hz = 2 * spectrum.info.resolution_bandwidth_hz;
  if (bins != all_bins(spectrum)) {
    const double low = spectrum.frequency(bins.first), high = spectrum.frequency(bins.second - 1);
    options.centre_hz = (low + high) / 2;
    options.span_hz = high - low + spectrum.info.spacing_hz / 2;
  }
  return lumra::find_peaks(spectrum.power, spectrum.info, most, options);
}

std::string level_text(double level_db, const output_arguments &outputs) {
  return fmt::format("{:.2f} {}", level_db + outputs.calibration_db, outputs.level_unit());
}

std::string peak_text(const lumra::peak &peak, const lumra::averaged_spectrum &spectrum,
                      const output_arguments &outputs) {
  return level_text(decibels(peak.power), outputs) + " at " +
         frequency_text(peak.frequency_hz, spectrum.info.spacing_hz / 100);
}

void add_spectrum_lines(results &shown, const spectrum_arguments &arguments, const lumra::averaged_spectrum &spectrum,
                        const output_arguments &outputs) {
  const lumra_spectrum_info &info = spectrum.info;
  shown.add_line("FFT size", fmt::format("N = {} (bin spacing {:.6g} Hz)", info.points, info.spacing_hz));
  shown.add_line("Window",
                 fmt::format("{} (noise bandwidth {:.4f} bins)", arguments.window, info.noise_bandwidth_bins));
  shown.add_line("Averaged", fmt::format("{} segments, overlap {:g} %", info.segments, arguments.overlap_percent));
  shown.add_line("Resolution bandwidth",
                 fmt::format("{:.6g} Hz (density in {}/Hz = level {:+.2f} dB)", info.resolution_bandwidth_hz,
                             outputs.level_unit(), -10 * std::log10(info.resolution_bandwidth_hz)));
}

std::string settings_text(const spectrum_arguments &arguments, const lumra::averaged_spectrum &spectrum) {
  const lumra_spectrum_info &info = spectrum.info;
  return fmt::format("N = {}  ·  {}  ·  {:g} % overlap  ·  {} averaged  ·  RBW {}", info.points,
                     arguments.window == "none" ? "no window" : arguments.window, arguments.overlap_percent,
                     info.segments, short_text(info.resolution_bandwidth_hz));
}

void add_curve(spectrum_picture &picture, const spectrum_arguments &arguments, const recording::source &source,
               const lumra::averaged_spectrum &spectrum, bin_range bins, const std::vector<lumra::peak> &peaks,
               const output_arguments &outputs) {
  const lumra_spectrum_info &info = spectrum.info;
  const bool whole = bins == all_bins(spectrum), two_sided = info.sides == 2;
  // The whole band is drawn from edge to edge.
  const double low =
      !whole ? spectrum.frequency(bins.first) : info.centre_hz - (two_sided ? info.sample_rate_hz / 2 : 0);
  const double high = whole ? info.centre_hz + info.sample_rate_hz / 2 : spectrum.frequency(bins.second - 1);
  if (picture.curves.empty()) {
    picture.low_hz = low;
    picture.high_hz = high;
    picture.centre_hz = info.centre_hz;
    picture.settings = settings_text(arguments, spectrum);
    const std::string band = band_text(spectrum, bins);
    if (!band.empty()) picture.settings += "  ·  " + band;
  }
  picture.low_hz = std::min(picture.low_hz, low);
  picture.high_hz = std::max(picture.high_hz, high);
  if (picture.high_hz <= picture.low_hz) {  // a single bin
    picture.low_hz -= info.spacing_hz / 2;
    picture.high_hz += info.spacing_hz / 2;
  }
  picture.curves.push_back(curve_of(source.name, spectrum, bins, outputs.calibration_db));
  // One peak has its figures beside it; several have numbers, and a list as long as there is room.
  constexpr std::size_t most_listed = 10;
  const std::string name = picture.is_shared ? "  " + source.name : "";
  for (const lumra::peak &peak : peaks) {
    const std::string text = peak_text(peak, spectrum, outputs);
    const std::string number = fmt::format("{}", picture.marks.size() + 1);
    const bool listed = picture.marks.size() < most_listed;
    const bool alone = peaks.size() == 1 && !picture.is_shared;
    picture.marks.push_back({peak.frequency_hz, decibels(peak.power) + outputs.calibration_db,
                             alone    ? text
                             : listed ? number
                                      : ""});
    if (!alone && listed) picture.list.push_back(fmt::format("{}   {}{}", number, text, name));
  }
}

ordered_json spectrum_json(const spectrum_arguments &arguments, const recording::source &source,
                           const lumra::averaged_spectrum &spectrum) {
  const lumra_spectrum_info &info = spectrum.info;
  return {{"sample_rate_hz", source.rate},
          {"frequency_hz", info.centre_hz},
          {"fft_size", info.points},
          {"window", arguments.window},
          {"overlap_percent", arguments.overlap_percent},
          {"segments", info.segments},
          {"bin_spacing_hz", info.spacing_hz},
          {"noise_bandwidth_bins", info.noise_bandwidth_bins},
          {"resolution_bandwidth_hz", info.resolution_bandwidth_hz}};
}

void add_peaks_json(ordered_json &object, const std::vector<lumra::peak> &peaks,
                    const lumra::averaged_spectrum &spectrum, const output_arguments &outputs) {
  object["peaks"] = ordered_json::array();
  for (const lumra::peak &peak : peaks)
    object["peaks"].push_back({{"frequency_hz", peak.frequency_hz},
                               {"level_db", json_number(decibels(peak.power) + outputs.calibration_db)}});
  object["total_power_db"] = json_number(decibels(total_power(spectrum)) + outputs.calibration_db);
}

}  // namespace tool
