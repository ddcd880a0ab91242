// The subcommands: each adds itself with its options to the command line and runs when it was called.
// SPDX-License-Identifier: MIT
#pragma once

#include <CLI/CLI.hpp>

namespace tool {

void add_evm(CLI::App &program);
void add_info(CLI::App &program);
void add_resample(CLI::App &program);
void add_spectrum(CLI::App &program);

}  // namespace tool
