// The recordings that a subcommand was given. SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>
#include <vector>

#include "analysis/selection.hpp"
#include "commands/arguments.hpp"
#include "recording/source.hpp"
#include "terminal/results.hpp"

namespace tool {

/// Opens them in order. Throws failure, and wrong_usage for a standard input that is named twice.
std::vector<recording::source> open_all(const input_arguments &inputs);

/// All files that are read.
std::vector<std::filesystem::path> files_of(const std::vector<recording::source> &sources);

/// The title of one picture for all of them.
std::string title_of(const std::vector<recording::source> &sources);

/// The lines of a summary that say which samples were analysed.
void add_recording_lines(results &shown, const recording::source &source, const selection &chosen);

}  // namespace tool
