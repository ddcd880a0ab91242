// lumra info: what is in a recording; without one, which library this is and what it runs on.
// SPDX-License-Identifier: MIT
#include <fmt/core.h>

#include <algorithm>
#include <lumra/lumra.hpp>
#include <memory>
#include <nlohmann/json.hpp>

#include "commands/arguments.hpp"
#include "commands/commands.hpp"
#include "commands/inputs.hpp"
#include "terminal/results.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

using nlohmann::ordered_json;
using recording::endless;

struct info_command {
  input_arguments inputs;
  output_arguments outputs;
};

/// People see so many captures, annotations and faults of a recording; JSON has all of them.
constexpr std::size_t most_lines = 20;

template <class Value>
ordered_json known(const std::optional<Value> &value) {
  return value ? ordered_json(*value) : ordered_json();
}

ordered_json count_of(std::uint64_t samples) {
  return samples == endless ? ordered_json() : ordered_json(samples);
}

double seconds(std::uint64_t samples, const recording::source &source) {
  return static_cast<double>(samples) / source.rate;
}

/// The centre of the whole recording, where all captures agree.
std::optional<double> common_frequency(const recording::source &source) {
  const auto &captures = source.captures;
  const bool agree = std::all_of(captures.begin(), captures.end(),
                                 [&](const auto &each) { return each.frequency == captures.front().frequency; });
  return agree ? captures.front().frequency : std::nullopt;
}

ordered_json json_of(const recording::source &source) {
  ordered_json object;
  object["path"] = source.path.string();
  object["datatype"] = source.datatype;
  object["sample_rate_hz"] = source.rate;
  object["frequency_hz"] = known(common_frequency(source));
  object["samples"] = count_of(source.samples);
  object["duration_s"] = source.samples == endless ? ordered_json() : ordered_json(seconds(source.samples, source));
  object["channels"] = source.channels;
  object["captures"] = ordered_json::array();
  for (const recording::capture &each : source.captures)
    object["captures"].push_back({{"start", each.start},
                                  {"samples", count_of(each.samples)},
                                  {"frequency_hz", known(each.frequency)},
                                  {"time", each.time.empty() ? ordered_json() : ordered_json(each.time)}});
  object["annotations"] = ordered_json::array();
  for (const recording::annotation &each : source.annotations)
    object["annotations"].push_back({{"start", each.start},
                                     {"samples", known(each.samples)},
                                     {"low_hz", known(each.low)},
                                     {"high_hz", known(each.high)},
                                     {"label", each.label},
                                     {"comment", each.comment}});
  object["faults"] = source.faults;
  return object;
}

void write_csv(output_file &csv, const recording::source &source) {
  const auto frequency = common_frequency(source);
  csv.print("{},{},{},{},", csv_text(source.path.string()), csv_text(source.datatype), source.rate,
            frequency ? fmt::format("{}", *frequency) : "");
  if (source.samples == endless)
    csv.print(",,");
  else
    csv.print("{},{},", source.samples, seconds(source.samples, source));
  csv.print("{},{},{},{}\n", source.channels, source.captures.size(), source.annotations.size(), source.faults.size());
}

template <class Items, class Text>
void add_lines(results &shown, const char *label, const Items &items, Text text) {
  for (std::size_t i = 0; i < std::min(items.size(), most_lines); ++i)
    shown.add_line(fmt::format("{} {}", label, i), text(items[i]));
  if (items.size() > most_lines) shown.add_line("", fmt::format("and {} more; see --json", items.size() - most_lines));
}

void summarise(results &shown, const recording::source &source) {
  const auto length = [&](std::uint64_t samples) {
    return samples == endless ? "samples up to the end of the input"
                              : fmt::format("{} samples ({:.6g} s)", samples, seconds(samples, source));
  };
  shown.add_line("Recording", fmt::format("{} ({})", source.path.string(), source.datatype));
  shown.add_line("Length", length(source.samples));
  shown.add_line("Sample rate", exact_text(source.rate));
  if (source.channels > 1) shown.add_line("Channels", fmt::format("{}, interleaved", source.channels));
  if (source.metadata) {
    const auto &global = source.metadata->at("global");
    const auto text = global.find("core:description");
    if (text != global.end() && text->is_string()) shown.add_line("Description", text->get<std::string>());
  }
  add_lines(shown, "Capture", source.captures, [&](const recording::capture &each) {
    return fmt::format("from {}, {}, {}{}", each.start, length(each.samples),
                       each.frequency ? exact_text(*each.frequency) : "unknown frequency",
                       each.time.empty() ? "" : ", " + each.time);
  });
  add_lines(shown, "Annotation", source.annotations, [&](const recording::annotation &each) {
    std::string text = fmt::format("from {}", each.start);
    if (each.samples) text += ", " + length(*each.samples);
    if (each.low) text += fmt::format(", {} to {}", exact_text(*each.low), exact_text(*each.high));
    for (const std::string &said : {each.label, each.comment})
      if (!said.empty()) text += ": " + said;
    return text;
  });
  add_lines(shown, "Fault", source.faults, [](const std::string &fault) { return fault; });
}

void show_library(results &shown, const output_files &files) {
  const lumra::library_info info = lumra::library();
  const char *path = info.uses_avx ? "AVX" : "baseline (no AVX)";
  shown.add_line("Library", info.name);
  shown.add_line("Version", fmt::format("{} ({}.{}.{})", info.version_text, LUMRA_VERSION_MAJOR, LUMRA_VERSION_MINOR,
                                        LUMRA_VERSION_PATCH));
  shown.add_line("Description", info.description);
  shown.add_line("Processor path", path);
  shown.add_line("Processors", std::to_string(qsUtilHS_NumCPUs()));
  shown.add_line("MKL", LUMRA_MKL_VERSION);
  if (files.json)
    write_json(*files.json, {{"library", info.name},
                             {"version", info.version_text},
                             {"processor_path", path},
                             {"processors", qsUtilHS_NumCPUs()},
                             {"mkl", LUMRA_MKL_VERSION}});
  if (files.csv)
    files.csv->print("library,version,processor_path,processors,mkl\n{},{},{},{},{}\n", csv_text(info.name),
                     csv_text(info.version_text), path, qsUtilHS_NumCPUs(), csv_text(LUMRA_MKL_VERSION));
}

results run(const info_command &command) {
  const std::vector<recording::source> sources = open_all(command.inputs);
  results given(files_of(sources));
  const output_files files = begin_outputs(given, command.outputs);
  if (sources.empty()) show_library(given, files);
  if (files.csv && !sources.empty())
    files.csv->print(
        "recording,datatype,sample_rate_hz,frequency_hz,samples,duration_s,channels,captures,annotations,faults\n");
  for (const recording::source &source : sources) {
    given.add_gap();
    summarise(given, source);
    if (files.json) write_json(*files.json, json_of(source));
    if (files.csv) write_csv(*files.csv, source);
  }
  add_output_lines(given, command.outputs);
  return given;
}

}  // namespace

void add_info(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<info_command>();
  CLI::App *app =
      add_command(program, "info", "What is in a recording; without one, the library's version and what it runs on");
  app->footer(
      "A fault is something wrong with the metadata that does not hinder reading. The library's own lines are the "
      "version, the processor path in use and the version of MKL.");
  add_inputs(*app, command->inputs);
  app->get_option("RECORDING")->required(false);
  add_outputs(*app, command->outputs,
              {"Write a row for each recording; captures, annotations and faults are counted", nullptr, false, false});
  app->callback([command, &work] { work = [command] { return run(*command); }; });
}

}  // namespace tool
