// The subcommands: each adds itself with its options to the command line, and sets the work when it was called.
// SPDX-License-Identifier: MIT
#pragma once

#include <CLI/CLI.hpp>
#include <functional>

#include "terminal/results.hpp"

namespace tool {

/// Its results are delivered when all else is released, so that nothing can fail behind that.
using work_to_do = std::function<results()>;

void add_channels(CLI::App &program, work_to_do &work);
void add_convert(CLI::App &program, work_to_do &work);
void add_evm(CLI::App &program, work_to_do &work);
/// The value of --align may be left out, which cannot be told from a recording behind it: "--align gain,dc" and
/// "--align" become "--align=gain,dc" and "--align=gain".
void complete_align(std::vector<std::string> &words);
void add_info(CLI::App &program, work_to_do &work);
void add_level(CLI::App &program, work_to_do &work);
void add_power(CLI::App &program, work_to_do &work);
void add_resample(CLI::App &program, work_to_do &work);
void add_spectrum(CLI::App &program, work_to_do &work);
void add_tone(CLI::App &program, work_to_do &work);
void add_waterfall(CLI::App &program, work_to_do &work);

}  // namespace tool
