// SPDX-License-Identifier: MIT
#include "documentation/generate.hpp"

#include <fmt/core.h>

#include <algorithm>
#include <cerrno>
#include <fstream>
#include <iterator>
#include <lumra/lumra.hpp>

#include "documentation/command_model.hpp"
#include "terminal/append.hpp"
#include "terminal/failure.hpp"

namespace tool {
namespace {

void write_file(const std::filesystem::path &file, const std::string &text) {
  std::ofstream out(file, std::ios::binary);
  out << text;
  if (!out.flush()) throw failure("cannot write {}: {}", file.string(), system_reason(errno));
}

/// A text that troff shows as it is.
std::string troff(const std::string &text) {
  std::string result;
  for (const char c : text)
    if (c == '\\')
      result += "\\e";
    else if (c == '-')
      result += "\\-";
    else
      result += c;
  return !result.empty() && (result.front() == '.' || result.front() == '\'') ? "\\&" + result : result;
}

std::string page(const described_command &command, const std::vector<described_command> &subcommands) {
  const bool whole = command.name == "lumra";
  const std::string name = whole ? "lumra" : "lumra-" + command.name;
  std::string title = name;
  std::transform(title.begin(), title.end(), title.begin(),
                 [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
  std::string text = fmt::format(".TH {} 1 \"\" \"lumra {}\"\n.SH NAME\n{} \\- {}\n.SH SYNOPSIS\n.B {}\n", title,
                                 lumra::library().version_text, troff(name), troff(command.help),
                                 troff(usage_of(command) + (whole ? " SUBCOMMAND ..." : "")));
  if (!command.footer.empty()) text += ".SH DESCRIPTION\n" + troff(command.footer) + "\n";
  const auto add = [&](const std::string &entry, const std::string &value, const std::string &help) {
    text += fmt::format(".TP\n.B {}{}\n{}\n", troff(entry), value.empty() ? "" : " \\fI" + troff(value) + "\\fR",
                        troff(help));
  };
  if (whole) text += ".SH SUBCOMMANDS\n";
  for (const described_command &each : subcommands) add(each.name, "", each.help);
  text += ".SH OPTIONS\n";
  for (const described_option &argument : command.arguments)
    add(argument.name + (argument.is_repeated ? "..." : ""), "", argument.help);
  for (const described_option &option : command.options)
    add(option.name, option.value, option.help + (option.is_required ? " (required)" : ""));
  text +=
      ".SH EXIT STATUS\n.TP\n.B 0\nDone.\n.TP\n.B 1\nBad input or failed work; one line on the standard error "
      "stream says what to do.\n.TP\n.B 2\nWrong usage; the line names the word.\n.SH SEE ALSO\n";
  if (!whole) return text + ".BR lumra (1)\n";
  for (std::size_t i = 0; i < subcommands.size(); ++i)
    text += fmt::format(".BR lumra\\-{} (1){}\n", subcommands[i].name, i + 1 < subcommands.size() ? "," : "");
  return text;
}

bool is_file_name(const described_option &option) {
  return option.value.starts_with("FILE") || option.value == "BASE";
}

/// What a list of names looks like in either shell.
std::string joined(const std::vector<std::string> &words) {
  std::string text;
  for (const std::string &word : words) text += (text.empty() ? "" : " ") + word;
  return text;
}

std::string bash_completion(const described_command &program, const std::vector<described_command> &subcommands) {
  std::vector<std::string> names;
  names.reserve(subcommands.size());
  for (const described_command &each : subcommands) names.push_back(each.name);
  std::string text =
      "# bash completion for lumra\n_lumra() {\n"
      "  local word=${COMP_WORDS[COMP_CWORD]} before=${COMP_WORDS[COMP_CWORD-1]} command= i\n"
      "  COMPREPLY=()\n"
      "  for ((i = 1; i < COMP_CWORD; ++i)); do\n"
      "    case ${COMP_WORDS[i]} in -*) ;; *) command=${COMP_WORDS[i]}; break ;; esac\n"
      "  done\n"
      "  case $command,$before in\n";
  for (const described_command &each : subcommands)
    for (const described_option &option : each.options) {
      if (option.value.empty() || is_file_name(option)) continue;
      append(text, "    {},{}) mapfile -t COMPREPLY < <(compgen -W '{}' -- \"$word\"); return ;;\n", each.name,
             option.name, joined(option.choices));
    }
  text += "  esac\n  case $command,$word in\n";
  const auto add_names = [&](const described_command &each, const std::string &pattern) {
    std::vector<std::string> options;
    for (const described_option &option : each.options) options.push_back(option.name);
    append(text, "    {}) mapfile -t COMPREPLY < <(compgen -W '{}' -- \"$word\") ;;\n", pattern, joined(options));
  };
  add_names(program, ",-*");
  append(text, "    ,*) mapfile -t COMPREPLY < <(compgen -W '{}' -- \"$word\") ;;\n", joined(names));
  for (const described_command &each : subcommands) add_names(each, each.name + ",-*");
  return text + "    *) compopt -o default ;;\n  esac\n}\ncomplete -F _lumra lumra\n";
}

/// A text within single quotes and brackets of a specification.
std::string zsh_text(const std::string &text) {
  std::string result;
  for (const char c : text)
    if (c == '\'')
      result += "'\\''";
    else if (c == '[' || c == ']' || c == ':' || c == '\\')
      result += std::string("\\") + c;
    else
      result += c;
  return result;
}

std::string zsh_option(const described_option &option) {
  // With "=", a value may follow in the same word or in the next.
  std::string text = fmt::format("'{}{}{}[{}]", option.is_repeated ? "*" : "", option.name,
                                 option.value.empty() ? "" : "=", zsh_text(option.help));
  if (!option.value.empty()) {
    text += ":" + zsh_text(option.value) + ":";
    if (is_file_name(option)) text += "_files";
    if (!option.choices.empty()) text += "(" + zsh_text(joined(option.choices)) + ")";
  }
  return text + "'";
}

std::string zsh_completion(const described_command &program, const std::vector<described_command> &subcommands) {
  std::string text =
      "#compdef lumra\n_lumra() {\n  local context state line\n  typeset -A opt_args\n"
      "  _arguments -C \\\n";
  for (const described_option &option : program.options) append(text, "    {} \\\n", zsh_option(option));
  text +=
      "    '1:subcommand:->subcommand' '*::argument:->argument'\n  case $state in\n    subcommand)\n"
      "      local -a names=(\n";
  for (const described_command &each : subcommands) append(text, "        '{}:{}'\n", each.name, zsh_text(each.help));
  text += "      )\n      _describe subcommand names ;;\n    argument)\n      case $words[1] in\n";
  for (const described_command &each : subcommands) {
    append(text, "        {})\n          _arguments \\\n", each.name);
    for (const described_option &option : each.options) append(text, "            {} \\\n", zsh_option(option));
    text += "            '*:file:_files' ;;\n";
  }
  return text + "      esac ;;\n  esac\n}\n_lumra \"$@\"\n";
}

}  // namespace

void generate(const CLI::App &program, const std::string &kind, const std::filesystem::path &folder) {
  const described_command whole = describe(program);
  const std::vector<described_command> subcommands = describe_subcommands(program);
  if (kind == "man") {
    write_file(folder / "lumra.1", page(whole, subcommands));
    for (const described_command &each : subcommands)
      write_file(folder / ("lumra-" + each.name + ".1"), page(each, {}));
  } else if (kind == "bash") {
    write_file(folder / "lumra", bash_completion(whole, subcommands));
  } else if (kind == "zsh") {
    write_file(folder / "_lumra", zsh_completion(whole, subcommands));
  } else {
    throw wrong_usage("--generate: '{}' is not man, bash or zsh", kind);
  }
}

}  // namespace tool
