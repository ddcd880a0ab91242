// lumra info: which library this is and what it runs on. SPDX-License-Identifier: MIT
#include <fmt/format.h>

#include <lumra/lumra.hpp>

#include "commands/commands.hpp"
#include "terminal/results.hpp"

namespace tool {
namespace {

results show_info() {
  const lumra::library_info info = lumra::library();
  results shown;
  shown.add_line("Library", info.name);
  shown.add_line("Version", fmt::format("{} ({}.{}.{})", info.version_text, LUMRA_VERSION_MAJOR, LUMRA_VERSION_MINOR,
                                        LUMRA_VERSION_PATCH));
  shown.add_line("Description", info.description);
  shown.add_line("Processor path", info.uses_avx ? "AVX" : "baseline (no AVX)");
  shown.add_line("Processors", std::to_string(qsUtilHS_NumCPUs()));
  shown.add_line("MKL", LUMRA_MKL_VERSION);
  return shown;
}

}  // namespace

void add_info(CLI::App &program, work_to_do &work) {
  program.add_subcommand("info", "Show the library's version, the processor path in use and the MKL version")
      ->callback([&work] { work = show_info; });
}

}  // namespace tool
