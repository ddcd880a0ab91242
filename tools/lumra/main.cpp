// The command-line program lumra. Exit codes: 0 done; 1 bad input or failed work, with one line that says what to do;
// 2 wrong usage; a signal's own when interrupted. SPDX-License-Identifier: MIT
#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <new>
#include <string>
#include <system_error>

#include <lumra/lumra.hpp>
#include "commands.hpp"
#include "failure.hpp"
#include "interruption.hpp"

namespace {

int fail(int code, std::string text) {
  std::replace(text.begin(), text.end(), '\n', ' ');  // names of files may hold anything
  fmt::print(stderr, "lumra: {}\n", text);
  return code;
}

int run(int count, char **arguments) {
  CLI::App program("Spectra, error vectors and resampling of recorded radio signals", "lumra");
  program.require_subcommand(1);
  program.set_version_flag("--version", "lumra " + lumra::library().version_text);
  tool::add_spectrum(program);
  tool::add_evm(program);
  tool::add_resample(program);
  tool::add_info(program);
  try {
    program.parse(count, arguments);
  } catch (const CLI::ParseError &error) {
    if (error.get_exit_code() == 0) return program.exit(error);  // help
    const auto called = program.get_subcommands();
    const std::string name = called.empty() ? "" : called.front()->get_name() + " ";
    return fail(2, fmt::format("{}; see lumra {}--help", error.what(), name));
  }
  if (std::fflush(stdout) != 0)
    throw tool::failure("cannot write the summary: {}", std::generic_category().message(errno));
  return 0;
}

}  // namespace

int main(int count, char **arguments) {
  tool::install_interruption();
  try {
    return run(count, arguments);
  } catch (const std::bad_alloc &) {
    return fail(1, "not enough memory; a spectrum needs less with a smaller --fft");
  } catch (const std::exception &error) {
    return fail(1, error.what());
  }
}
