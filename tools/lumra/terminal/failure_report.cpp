// SPDX-License-Identifier: MIT
#include "terminal/failure_report.hpp"

#include <unistd.h>

#include <atomic>
#include <exception>
#include <lumra/lumra.hpp>
#include <new>
#include <stdexcept>
#include <string>
#include <system_error>

#include "terminal/failure.hpp"
#include "terminal/interruption.hpp"
#include "terminal/printable.hpp"

namespace tool {
namespace {

constexpr std::string_view no_memory_line =
    "lumra: not enough memory; end other programs, or ask for less (a smaller --fft)\n";
constexpr std::string_view no_memory = no_memory_line.substr(7, no_memory_line.size() - 8);

/// Two system calls, for whatever is left of the program.
[[noreturn]] void end_at_once(std::string_view line) noexcept {
  static std::atomic_flag ending;
  if (ending.test_and_set())
    for (;;) ::pause();  // another thread is about to end the program
  abandon_work();
  (void)!::write(STDERR_FILENO, line.data(), line.size());
  ::_exit(1);
}

[[noreturn]] void end_without_memory() {
  end_at_once(no_memory_line);
}

/// An exception that found no memory for itself is not there when this is called.
[[noreturn]] void end_unexpectedly() {
  if (!std::current_exception()) end_without_memory();
  end_at_once("lumra: internal failure; please report it with the command line\n");
}

/// The program checks what it passes on, so that a refusal by the library has its reason in the machine.
std::string library_reason(const lumra::error &error) {
  const std::int32_t code = error.status().code();
  switch (code) {
    case LUMRA_TOOLKIT_NO_MEMORY:
    case LUMRA_ALLOCATION_FAILED:
    case LUMRA_NO_MEMORY:
      return std::string(no_memory);
    case LUMRA_INTERNAL_ERROR:
    case LUMRA_TOOLKIT_TRANSFORM_FAILED:
    case LUMRA_TOOLKIT_NO_TRANSFORM:
      return fmt::format("{}, as far as status {} of the library tells", no_memory, code);
    default:
      return fmt::format("the library refuses the work: {} (status {}); please report it with the command line",
                         error.what(), code);
  }
}

}  // namespace

void install_failure_report() noexcept {
  std::set_new_handler(end_without_memory);
  std::set_terminate(end_unexpectedly);
}

void report(std::string_view text) {
  const std::string line = "lumra: " + printable(text) + "\n";
  (void)!::write(STDERR_FILENO, line.data(), line.size());
}

void report_current_exception() {
  try {
    throw;
  } catch (const lumra::error &error) {
    report(library_reason(error));
  } catch (const std::bad_alloc &) {
    report(no_memory);
  } catch (const std::length_error &) {
    report(no_memory);
  } catch (const std::system_error &error) {
    // A thread that cannot be started has no room for its stack.
    const bool lacks_room =
        error.code() == std::errc::not_enough_memory || error.code() == std::errc::resource_unavailable_try_again;
    report(lacks_room ? no_memory : error.what());
  } catch (const std::exception &error) {
    report(error.what());
  }
}

}  // namespace tool
