// lumra info: which library this is and what it runs on. SPDX-License-Identifier: MIT
#include <fmt/format.h>

#include <lumra/lumra.hpp>

#include "commands.hpp"

namespace tool {
namespace {

void show_info() {
  const lumra::library_info info = lumra::library();
  fmt::print("{:<18}{}\n", "Library", info.name);
  fmt::print("{:<18}{} ({}.{}.{})\n", "Version", info.version_text, LUMRA_VERSION_MAJOR, LUMRA_VERSION_MINOR,
             LUMRA_VERSION_PATCH);
  fmt::print("{:<18}{}\n", "Description", info.description);
  fmt::print("{:<18}{}\n", "Processor path", info.uses_avx ? "AVX" : "baseline (no AVX)");
  fmt::print("{:<18}{}\n", "Processors", qsUtilHS_NumCPUs());
  fmt::print("{:<18}{}\n", "MKL", LUMRA_MKL_VERSION);
}

}  // namespace

void add_info(CLI::App &program) {
  program.add_subcommand("info", "Show the library's version, the processor path in use and the MKL version")
      ->callback(show_info);
}

}  // namespace tool
