// SPDX-License-Identifier: MIT
#include "documentation/help.hpp"

#include <unistd.h>

#include <algorithm>

#include "documentation/command_model.hpp"
#include "terminal/console.hpp"

namespace tool {
namespace {

constexpr std::size_t indent = 26;

void add_entry(std::string &help, const std::string &name, const std::string &text, std::size_t width) {
  const std::string front = "  " + name;
  help += front;
  help += front.size() + 2 > indent ? "\n" + std::string(indent, ' ') : std::string(indent - front.size(), ' ');
  help += wrapped(text, width, indent) + '\n';
}

}  // namespace

std::string help_formatter::make_help(const CLI::App *app, std::string, CLI::AppFormatMode) const {
  const std::size_t width = std::clamp<std::size_t>(columns_of(STDOUT_FILENO), 40, 80);
  const described_command command = describe(*app);
  std::string help = wrapped(command.help, width, 0) + "\n\nUsage: " + usage_of(command);
  const auto commands = describe_subcommands(*app);
  help += commands.empty() ? "\n" : " SUBCOMMAND ...\n";
  if (!command.arguments.empty()) help += "\nArguments:\n";
  for (const described_option &argument : command.arguments)
    add_entry(help, argument.name + (argument.is_repeated ? "..." : ""), argument.help, width);
  help += "\nOptions:\n";
  for (const described_option &option : command.options)
    add_entry(help, option.value.empty() ? option.name : option.name + " " + option.value,
              option.help + (option.is_required ? " (required)" : ""), width);
  if (!commands.empty()) help += "\nSubcommands:\n";
  for (const described_command &each : commands) add_entry(help, each.name, each.help, width);
  if (!command.footer.empty()) help += "\n" + wrapped(command.footer, width, 0) + '\n';
  return help;
}

}  // namespace tool
