// How the subcommands that stand on an averaged spectrum are told to make it. SPDX-License-Identifier: MIT
#pragma once

#include <CLI/CLI.hpp>
#include <cstdint>
#include <lumra/measure.hpp>
#include <lumra/spectrum.hpp>
#include <nlohmann/json_fwd.hpp>
#include <string>
#include <utility>
#include <vector>

#include "analysis/selection.hpp"
#include "commands/arguments.hpp"
#include "pictures/spectrum_picture.hpp"
#include "recording/source.hpp"

namespace tool {

struct spectrum_arguments {
  std::uint64_t fft_size = 0;       // 0: from rbw_hz, or else
  std::uint64_t usual_size = 4096;  // this or less if it must fit
  double rbw_hz = 0;
  std::string window = "flattop";
  double overlap_percent = 50;
  bool hold = false;  // also the highest and the lowest segment of each bin
};

void add_spectrum_options(CLI::App &app, spectrum_arguments &arguments);

/// The settings for a selection of samples. Throws failure where none of its stretches holds a segment.
lumra::spectrum_settings settings_for(const spectrum_arguments &arguments, const recording::source &source,
                                      const selection &chosen, const output_arguments &outputs);

/// The averaged spectrum of a selection, whose samples become those that there were.
lumra::averaged_spectrum average(const recording::source &source, selection &chosen,
                                 const lumra::spectrum_settings &settings);

/// A part of the band: bins [first, second).
using bin_range = std::pair<std::size_t, std::size_t>;
bin_range all_bins(const lumra::averaged_spectrum &spectrum);

/// Level of a power in dB; minus infinity for none.
double decibels(double power) noexcept;
/// The power of all samples.
double total_power(const lumra::averaged_spectrum &spectrum);
/// The highest peaks of a part of the band, apart by more than the window's width.
std::vector<lumra::peak> highest_peaks(const lumra::averaged_spectrum &spectrum, bin_range bins, std::size_t most);

/// The lines of a summary about the spectrum itself.
void add_spectrum_lines(results &shown, const spectrum_arguments &arguments, const lumra::averaged_spectrum &spectrum,
                        const output_arguments &outputs);
/// The same in a picture.
std::string settings_text(const spectrum_arguments &arguments, const lumra::averaged_spectrum &spectrum);
/// "-12.34 dBFS".
std::string level_text(double level_db, const output_arguments &outputs);
/// The peak as summaries and pictures show it.
std::string peak_text(const lumra::peak &peak, const lumra::averaged_spectrum &spectrum,
                      const output_arguments &outputs);

/// Adds a recording's curve with its peaks to a picture. The first one's settings stand below the title.
void add_curve(spectrum_picture &picture, const spectrum_arguments &arguments, const recording::source &source,
               const lumra::averaged_spectrum &spectrum, bin_range bins, const std::vector<lumra::peak> &peaks,
               const output_arguments &outputs);

/// The keys that say what the spectrum is, without peaks and total power.
nlohmann::ordered_json spectrum_json(const spectrum_arguments &arguments, const recording::source &source,
                                     const lumra::averaged_spectrum &spectrum);
/// Adds peaks and total power.
void add_peaks_json(nlohmann::ordered_json &object, const std::vector<lumra::peak> &peaks,
                    const lumra::averaged_spectrum &spectrum, const output_arguments &outputs);

}  // namespace tool
