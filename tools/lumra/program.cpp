// SPDX-License-Identifier: MIT
#include "program.hpp"

#include <algorithm>
#include <lumra/lumra.hpp>
#include <sstream>

#include "commands/commands.hpp"
#include "documentation/command_model.hpp"
#include "documentation/generate.hpp"
#include "documentation/help.hpp"
#include "terminal/failure.hpp"
#include "terminal/failure_report.hpp"

namespace tool {
namespace {

std::string suggestion(const std::string &wrong, const std::vector<std::string> &names) {
  const std::string nearest = nearest_name(wrong, names);
  return nearest.empty() ? "" : fmt::format("; did you mean {}?", nearest);
}

/// Names the first option that there is not, before anything else is found missing.
void check_option(const CLI::App &app, const std::string &word) {
  if (word.size() < 2 || word[0] != '-' || (word[1] != '-' && std::isalpha(static_cast<unsigned char>(word[1])) == 0))
    return;
  const std::string name = word.starts_with("--") ? word.substr(0, word.find('=')) : word.substr(0, 2);
  if (app.get_option_no_throw(name)) return;
  std::vector<std::string> names;
  for (const described_option &option : describe(app).options) names.push_back(option.name);
  throw wrong_usage("there is no option {}{}", name, suggestion(name, names));
}

/// The subcommand, once its options and those of the program are known to exist.
const CLI::App *check_words(const CLI::App &program, int count, const char *const *arguments) {
  const CLI::App *called = nullptr;
  for (int i = 1; i < count && std::string_view(arguments[i]) != "--"; ++i) {
    const std::string word = arguments[i];
    try {
      check_option(called ? *called : program, word);
    } catch (const wrong_usage &reason) {
      if (!called) throw;
      throw wrong_usage("{}: {}", called->get_name(), reason.what());
    }
    if (!called && word == "--generate") return nullptr;
    if (called || word.starts_with('-')) continue;
    std::vector<std::string> names;
    for (const CLI::App *each : program.get_subcommands([](const CLI::App *) { return true; })) {
      names.push_back(each->get_name());
      if (names.back() == word) called = each;
    }
    if (called) continue;
    throw wrong_usage("there is no subcommand '{}'{}", word, suggestion(word, names));
  }
  return called;
}

int run(int count, const char *const *arguments) {
  CLI::App program("Spectra, levels, error vectors, channels and resampling of recorded radio signals", "lumra");
  program.formatter(std::make_shared<help_formatter>());
  program.set_help_flag("--help,-h", "Show this and end");
  program.set_version_flag("--version", "lumra " + lumra::library().version_text, "Show the version and end");
  program.footer(
      "Numbers take the prefixes k, M, G, m, u and n: --rate 10M, --duration 20ms. Frequencies are absolute; levels "
      "are "
      "in dB of full scale. Exit codes: 0 done, 1 bad input or failed work, 2 wrong usage. lumra SUBCOMMAND --help "
      "says "
      "more.");
  std::vector<std::string> generated;
  program.add_option("--generate", generated)->expected(2)->group("");
  work_to_do work;
  add_info(program, work);
  add_spectrum(program, work);
  add_power(program, work);
  add_tone(program, work);
  add_waterfall(program, work);
  add_level(program, work);
  add_evm(program, work);
  add_resample(program, work);
  add_channels(program, work);
  add_convert(program, work);
  std::string name;
  const auto refuse = [&](const std::string &reason) {
    report(fmt::format("{}; see lumra {}--help", reason, name));
    return 2;
  };
  try {
    if (const CLI::App *called = check_words(program, count, arguments)) name = called->get_name() + " ";
    std::vector<std::string> words(arguments + std::min(count, 1), arguments + count);
    complete_align(words);
    std::reverse(words.begin(), words.end());
    program.parse(words);
    if (!generated.empty())
      generate(program, generated[0], generated[1]);
    else if (!work)
      throw wrong_usage("a subcommand is missing");
    else
      work().deliver();
    return 0;
  } catch (const CLI::ParseError &error) {
    if (error.get_exit_code() != 0) return refuse(error.what());
    std::ostringstream help;
    program.exit(error, help);
    print(help.str());
    return 0;
  } catch (const wrong_usage &reason) {
    return refuse(reason.what());
  }
}

}  // namespace

int run_program(int count, const char *const *arguments) {
  try {
    return run(count, arguments);
  } catch (...) {
    report_current_exception();
    return 1;
  }
}

}  // namespace tool
