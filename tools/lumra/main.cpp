// The command-line program lumra. SPDX-License-Identifier: MIT
#include <fcntl.h>
#include <unistd.h>

#include "program.hpp"
#include "terminal/failure_report.hpp"
#include "terminal/interruption.hpp"

namespace {

/// This runs before the constructors of other files, which allocate.
[[gnu::constructor(101)]] void begin() {
  tool::install_failure_report();
}

/// A file that is opened must not become one of the standard streams.
void open_standard_streams() {
  for (const int stream : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO})
    if (::fcntl(stream, F_GETFD) < 0) (void)::open("/dev/null", O_RDWR);
}

}  // namespace

int main(int count, char **arguments) {
  open_standard_streams();
  tool::install_interruption();
  return tool::run_program(count, arguments);
}
