// SPDX-License-Identifier: MIT
#include "documentation/command_model.hpp"

#include <algorithm>
#include <numeric>

namespace tool {
namespace {

/// Changes of one letter, and of two neighbours, that make one word the other.
std::size_t distance_between(const std::string &a, const std::string &b) {
  std::vector<std::vector<std::size_t>> least(a.size() + 1, std::vector<std::size_t>(b.size() + 1));
  std::iota(least[0].begin(), least[0].end(), 0);
  for (std::size_t i = 1; i <= a.size(); ++i) {
    least[i][0] = i;
    for (std::size_t k = 1; k <= b.size(); ++k) {
      least[i][k] =
          std::min({least[i - 1][k] + 1, least[i][k - 1] + 1, least[i - 1][k - 1] + (a[i - 1] == b[k - 1] ? 0 : 1)});
      if (i > 1 && k > 1 && a[i - 1] == b[k - 2] && a[i - 2] == b[k - 1])
        least[i][k] = std::min(least[i][k], least[i - 2][k - 2] + 1);
    }
  }
  return least[a.size()][b.size()];
}

std::vector<std::string> split(const std::string &text, char separator) {
  std::vector<std::string> parts;
  for (std::size_t from = 0; from < text.size();) {
    const std::size_t end = std::min(text.find(separator, from), text.size());
    parts.push_back(text.substr(from, end - from));
    from = end + 1;
  }
  return parts;
}

}  // namespace

CLI::Option *with_choices(CLI::Option *option, const std::vector<std::string> &choices) {
  // Help shows the option's text, so that the name of its type is free for this.
  std::string joined;
  for (const std::string &choice : choices) joined += (joined.empty() ? "" : "|") + choice;
  return option->type_name("|" + joined);
}

described_command describe(const CLI::App &app) {
  described_command command{app.get_name(), app.get_description(), app.get_footer(), {}, {}};
  for (const CLI::Option *option : app.get_options()) {
    if (option->get_group().empty()) continue;
    described_option described;
    described.name = option->get_name();
    described.help = option->get_description();
    described.is_required = option->get_required();
    described.is_repeated = option->get_items_expected_max() > 1;
    if (option->get_items_expected_max() > 0) described.value = option->get_option_text();
    if (const std::string type = option->get_type_name(); type.starts_with('|'))
      described.choices = split(type.substr(1), '|');
    (option->get_positional() ? command.arguments : command.options).push_back(std::move(described));
  }
  return command;
}

std::vector<described_command> describe_subcommands(const CLI::App &program) {
  std::vector<described_command> commands;
  for (const CLI::App *app : program.get_subcommands([](const CLI::App *) { return true; }))
    commands.push_back(describe(*app));
  return commands;
}

std::string usage_of(const described_command &command) {
  std::string usage = (command.name == "lumra" ? "lumra" : "lumra " + command.name) + " [OPTIONS]";
  for (const described_option &argument : command.arguments) {
    const std::string name = argument.name + (argument.is_repeated ? "..." : "");
    usage += argument.is_required ? " " + name : " [" + name + "]";
  }
  return usage;
}

std::string nearest_name(const std::string &wrong, const std::vector<std::string> &names) {
  std::string nearest;
  std::size_t least = wrong.size() / 3 + 1;
  for (const std::string &name : names) {
    const std::size_t distance = distance_between(wrong, name);
    if (distance > least || (distance == least && !nearest.empty())) continue;
    least = distance;
    nearest = name;
  }
  return nearest;
}

}  // namespace tool
