// SPDX-License-Identifier: MIT
#include "program.hpp"

#include <lumra/lumra.hpp>
#include <sstream>

#include "commands/commands.hpp"
#include "terminal/failure_report.hpp"

namespace tool {
namespace {

int run(int count, const char *const *arguments) {
  CLI::App program("Spectra, error vectors and resampling of recorded radio signals", "lumra");
  program.require_subcommand(1);
  program.set_version_flag("--version", "lumra " + lumra::library().version_text);
  work_to_do work;
  add_spectrum(program, work);
  add_evm(program, work);
  add_resample(program, work);
  add_info(program, work);
  try {
    program.parse(count, arguments);
  } catch (const CLI::ParseError &error) {
    if (error.get_exit_code() == 0) {
      std::ostringstream help;
      program.exit(error, help);
      print(help.str());
      return 0;
    }
    const auto called = program.get_subcommands();
    const std::string name = called.empty() ? "" : called.front()->get_name() + " ";
    report(fmt::format("{}; see lumra {}--help", error.what(), name));
    return 2;
  }
  work().deliver();
  return 0;
}

}  // namespace

int run_program(int count, const char *const *arguments) {
  try {
    return run(count, arguments);
  } catch (...) {
    report_current_exception();
    return 1;
  }
}

}  // namespace tool
