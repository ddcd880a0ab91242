// SPDX-License-Identifier: MIT
#include "commands/inputs.hpp"

#include <fmt/core.h>

#include <algorithm>

#include "recording/open.hpp"
#include "terminal/failure.hpp"
#include "terminal/units.hpp"

namespace tool {

std::vector<recording::source> open_all(const input_arguments &inputs) {
  if (std::count(inputs.paths.begin(), inputs.paths.end(), "-") > 1)
    throw wrong_usage("RECORDING: the standard input, -, can be read once");
  std::vector<recording::source> sources;
  for (const std::string &path : inputs.paths) sources.push_back(recording::open(path, inputs.options));
  return sources;
}

std::vector<std::filesystem::path> files_of(const std::vector<recording::source> &sources) {
  std::vector<std::filesystem::path> files;
  for (const recording::source &source : sources) files.insert(files.end(), source.files.begin(), source.files.end());
  return files;
}

std::string title_of(const std::vector<recording::source> &sources) {
  constexpr std::size_t most_named = 3;
  if (sources.size() > most_named) return fmt::format("{} and {} more", sources.front().name, sources.size() - 1);
  std::string title;
  for (const recording::source &source : sources) title += (title.empty() ? "" : ", ") + source.name;
  return title;
}

void add_recording_lines(results &shown, const recording::source &source, const selection &chosen) {
  const std::string channel =
      source.channels > 1 ? fmt::format(", channel {} of {}", source.channel, source.channels) : "";
  shown.add_line("Recording", fmt::format("{} ({}{})", source.data.string(), source.datatype, channel));
  if (!chosen.text.empty()) shown.add_line("Part", chosen.text);
  shown.add_line("Samples",
                 fmt::format("{} ({:.6g} s)", chosen.samples, static_cast<double>(chosen.samples) / source.rate));
  shown.add_line("Sample rate", exact_text(source.rate));
  shown.add_line("Centre frequency", chosen.frequency ? exact_text(*chosen.frequency) : "unknown, taken as 0 Hz");
}

}  // namespace tool
