// What the command line takes, read from the options themselves: for help, manual and completion.
// SPDX-License-Identifier: MIT
#pragma once

#include <CLI/CLI.hpp>
#include <string>
#include <vector>

namespace tool {

struct described_option {
  std::string name;   // "--fft", or of an argument "RECORDING"
  std::string value;  // "N"; empty for a flag
  std::string help;
  std::vector<std::string> choices;  // of the value; empty where there is no list of them
  bool is_required = false, is_repeated = false;
};

struct described_command {
  std::string name, help, footer;
  std::vector<described_option> arguments, options;
};

/// Says which values an option may have, for completion.
CLI::Option *with_choices(CLI::Option *option, const std::vector<std::string> &choices);

/// Hidden options are left out.
described_command describe(const CLI::App &app);
/// The subcommands in the order in which they were added.
std::vector<described_command> describe_subcommands(const CLI::App &program);

/// "lumra spectrum [OPTIONS] RECORDING..."
std::string usage_of(const described_command &command);

/// Names that may have been meant by a wrong one: the nearest, or none.
std::string nearest_name(const std::string &wrong, const std::vector<std::string> &names);

}  // namespace tool
