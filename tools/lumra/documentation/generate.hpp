// Manual pages and completions, made when the program is built. SPDX-License-Identifier: MIT
#pragma once

#include <CLI/CLI.hpp>
#include <filesystem>
#include <string>

namespace tool {

/// Writes into a folder: "man" a page of the program and one of each subcommand, "bash" and "zsh" the completion for
/// that shell. Throws failure, and wrong_usage for another kind.
void generate(const CLI::App &program, const std::string &kind, const std::filesystem::path &folder);

}  // namespace tool
