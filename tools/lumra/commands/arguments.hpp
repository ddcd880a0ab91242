// What several subcommands take, and what all of them understand by it. SPDX-License-Identifier: MIT
#pragma once

#include <CLI/CLI.hpp>
#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

#include "pictures/gnuplot.hpp"
#include "recording/options.hpp"
#include "terminal/failure.hpp"
#include "terminal/number.hpp"
#include "terminal/results.hpp"

namespace tool {

/// A new subcommand. The library of command lines is all in headers: this function alone compiles its parser.
CLI::App *add_command(CLI::App &program, const char *name, const char *help);

/// An option's value is a number, with a prefix or without, that satisfies `holds`.
template <class Holds>
CLI::Validator number_where(const char *what, Holds holds) {
  return {[=](std::string &text) {
            const auto value = parse_number(text);
            if (!value || !holds(*value)) return fmt::format("'{}' is not {}", text, what);
            text = plain_number(*value);
            return std::string();
          },
          ""};
}
CLI::Validator any_number();
CLI::Validator positive_number();
/// Recordings refuse an index that they do not have themselves, one below 0 too.
CLI::Validator index_number();
CLI::Validator whole_number(std::uint64_t lowest, std::uint64_t highest);

/// The numbers of a text between separators; throws wrong_usage that names the option.
std::vector<double> parse_numbers(const char *option, std::string_view text, char separator);

struct input_arguments {
  std::vector<std::string> paths;
  recording::options options;
};

inline constexpr const char *recording_help =
    "SigMF recording (either file, their common name, or an archive), WAV file, raw file, or - for the standard input";
inline constexpr const char *capture_help = "Use this capture of a SigMF recording alone, from 0";

/// Adds RECORDING... and what is said about recordings.
void add_inputs(CLI::App &app, input_arguments &inputs);
/// Adds what is said about recordings, under the names that the options carry: all of it but the capture.
void add_recording_options(CLI::App &app, recording::options &options);
/// Adds the option for the capture alone.
void add_capture_option(CLI::App &app, recording::options &options, const char *help);

struct output_arguments {
  std::string json, csv, plot;
  double calibration_db = 0;
  bool is_calibrated = false;
  std::uint32_t threads = 0;

  /// Levels are shown in this unit.
  [[nodiscard]] const char *level_unit() const noexcept { return is_calibrated ? "dBm" : "dBFS"; }
  /// The same in names of columns.
  [[nodiscard]] const char *level_column() const noexcept { return is_calibrated ? "dbm" : "dbfs"; }
};

/// What a subcommand writes as CSV and draws; null where it does not.
struct output_help {
  const char *csv, *plot;
  bool levels = true;   // takes --cal
  bool threads = true;  // takes --threads
};
void add_outputs(CLI::App &app, output_arguments &outputs, const output_help &help);

/// The files that were asked for, begun; null where they were not.
struct output_files {
  output_file *json = nullptr, *csv = nullptr, *plot = nullptr;
  picture_type type = picture_type::png;
};
/// Throws wrong_usage where two outputs would be one, and failure.
output_files begin_outputs(results &given, const output_arguments &outputs);
/// Tells in the summary which files there are.
void add_output_lines(results &shown, const output_arguments &outputs);

/// One line.
void write_json(output_file &file, const nlohmann::ordered_json &object);
/// A figure in JSON and CSV: null and nothing where it is not finite, as the level of silence.
nlohmann::ordered_json json_number(double value);
std::string csv_number(double value, int decimals = 4);
/// A text as one cell of a row.
std::string csv_text(std::string_view text);

}  // namespace tool
