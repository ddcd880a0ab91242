// SPDX-License-Identifier: MIT
#include "commands/arguments.hpp"

#include <cmath>
#include <filesystem>
#include <nlohmann/json.hpp>

#include "documentation/command_model.hpp"

namespace tool {

using nlohmann::ordered_json;

CLI::App *add_command(CLI::App &program, const char *name, const char *help) {
  return program.add_subcommand(name, help);
}

CLI::Validator any_number() {
  return number_where("a number", [](double) { return true; });
}

CLI::Validator positive_number() {
  return number_where("a positive number", [](double value) { return value > 0; });
}

CLI::Validator whole_number(std::uint64_t lowest, std::uint64_t highest) {
  return {[=](std::string &text) {
            const auto value = parse_number(text);
            if (!value || *value != std::trunc(*value) || *value < static_cast<double>(lowest) ||
                *value > static_cast<double>(highest))
              return fmt::format("'{}' is not a whole number from {} to {}", text, lowest, highest);
            text = plain_number(*value);
            return std::string();
          },
          ""};
}

CLI::Validator index_number() {
  return number_where("a whole number",
                      [](double value) { return value == std::trunc(value) && std::abs(value) < 0x1p53; });
}

std::vector<double> parse_numbers(const char *option, std::string_view text, char separator) {
  std::vector<double> numbers;
  for (std::string_view rest = text;;) {
    const std::size_t end = std::min(rest.find(separator), rest.size());
    const auto number = parse_number(rest.substr(0, end));
    if (!number) throw wrong_usage("{}: '{}' in '{}' is not a number", option, rest.substr(0, end), text);
    numbers.push_back(*number);
    if (end == rest.size()) return numbers;
    rest.remove_prefix(end + 1);
  }
}

void add_inputs(CLI::App &app, input_arguments &inputs) {
  app.add_option("RECORDING", inputs.paths, recording_help)->required();
  add_recording_options(app, inputs.options);
  add_capture_option(app, inputs.options, capture_help);
}

void add_recording_options(CLI::App &app, recording::options &options) {
  const recording::option_names &names = options.names;
  app.add_option(names.rate, options.rate, "Sample rate as recorded; needed for raw files, overrides the metadata")
      ->option_text("HZ")
      ->transform(positive_number());
  app.add_option(names.frequency, options.frequency, "Centre frequency as recorded; overrides the metadata")
      ->option_text("HZ")
      ->transform(any_number());
  with_choices(app.add_option(names.format, options.format,
                              "Sample type (cf32, cf64, ci32, ci16, ci8, cu32, cu16, cu8, or real with r in front; _le "
                              "or _be); overrides the metadata")
                   ->option_text("NAME"),
               {"cf32", "cf64", "ci32", "ci16", "ci8", "cu32", "cu16", "cu8", "rf32", "rf64", "ri32", "ri16", "ri8",
                "ru32", "ru16", "ru8"});
  app.add_option(names.channel, options.channel, "Channel of several interleaved ones, from 0 (default: the first)")
      ->option_text("INDEX")
      ->transform(index_number());
  app.add_option(names.start, options.start, "Skip so much of the recording, or of the chosen capture")
      ->option_text("SECONDS")
      ->transform(number_where("a time from 0", [](double value) { return value >= 0; }));
  app.add_option(names.duration, options.duration, "Use so much of it")
      ->option_text("SECONDS")
      ->transform(positive_number());
}

void add_capture_option(CLI::App &app, recording::options &options, const char *help) {
  app.add_option(options.names.capture, options.capture, help)->option_text("INDEX")->transform(index_number());
}

void add_outputs(CLI::App &app, output_arguments &outputs, const output_help &help) {
  app.add_option("--json", outputs.json, "Write the figures, one object a line; - is the standard output")
      ->option_text("FILE");
  if (help.csv) app.add_option("--csv", outputs.csv, help.csv)->option_text("FILE");
  if (help.plot) app.add_option("--plot", outputs.plot, help.plot)->option_text("FILE.png|.svg|.pdf");
  if (help.levels) {
    app.add_option("--cal", outputs.calibration_db, "Add this to every level, which is then in dBm")
        ->option_text("DB")
        ->transform(any_number())
        ->each([&outputs](const std::string &) { outputs.is_calibrated = true; });
  }
  if (help.threads)
    app.add_option("--threads", outputs.threads, "Compute with so many threads (default: as many as pay)")
        ->option_text("N")
        ->transform(whole_number(1, 1024));
}

output_files begin_outputs(results &given, const output_arguments &outputs) {
  const std::pair<const char *, const std::string *> named[] = {
      {"--json", &outputs.json}, {"--csv", &outputs.csv}, {"--plot", &outputs.plot}};
  const auto place = [](const std::string &file) { return std::filesystem::absolute(file).lexically_normal(); };
  for (const auto &[name, file] : named)
    for (const auto &[other, second] : named) {
      if (file == second) break;
      if (file->empty() || second->empty() || (*file != *second && place(*file) != place(*second))) continue;
      throw wrong_usage("{} and {} are both to be {}; give each a file of its own", other, name,
                        *file == standard_output ? "the standard output" : *file);
    }
  output_files files;
  if (!outputs.plot.empty()) files.type = picture_type_of(outputs.plot);
  if (!outputs.json.empty()) files.json = &given.add_file(outputs.json);
  if (!outputs.csv.empty()) files.csv = &given.add_file(outputs.csv);
  if (!outputs.plot.empty()) files.plot = &given.add_file(outputs.plot);
  return files;
}

void add_output_lines(results &shown, const output_arguments &outputs) {
  if (!outputs.json.empty()) shown.add_line("JSON", outputs.json);
  if (!outputs.csv.empty()) shown.add_line("CSV", outputs.csv);
  if (!outputs.plot.empty()) shown.add_line("Picture", outputs.plot);
}

void write_json(output_file &file, const ordered_json &object) {
  file.print("{}\n", object.dump(-1, ' ', false, ordered_json::error_handler_t::replace));
}

ordered_json json_number(double value) {
  return std::isfinite(value) ? ordered_json(value) : ordered_json();
}

std::string csv_number(double value, int decimals) {
  return std::isfinite(value) ? fmt::format("{:.{}f}", value, decimals) : "";
}

std::string csv_text(std::string_view text) {
  if (text.find_first_of(",\"\r\n") == std::string_view::npos) return std::string(text);
  std::string cell = "\"";
  for (const char c : text) cell.append(c == '"' ? 2 : 1, c);
  return cell + '"';
}

}  // namespace tool
