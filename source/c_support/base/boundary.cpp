// SPDX-License-Identifier: MIT
#include "c_support/base/boundary.hpp"

#include <lumra/status.h>

#include <new>

#include "platform/process.hpp"

namespace c_support {
namespace {

/// A log that has no memory for the entry loses it; the status code still reaches the caller.
void append(qsrfhs::log::Logger *log, qsrfhs::source_position at, const char *text, qsrfhs::log::level level) noexcept {
  if (!log) return;
  try {
    log->add({at.line, at.file, text, static_cast<std::int32_t>(level), platform::thread_id()});
  } catch (...) {
    return;
  }
}

}  // namespace

std::int32_t translate_current_exception(qsrfhs::log::Logger *log, const catch_positions *at) noexcept {
  using qsrfhs::log::level;
  const catch_positions here = at ? *at : catch_positions{};
  try {
    throw;
  } catch (const qsrfhs::invalid_argument &e) {
    append(log, {e.file, e.line}, e.what(), level::exception);
    return LUMRA_INVALID_ARGUMENT;
  } catch (const qsrfhs::error &e) {
    append(log, {e.file, e.line}, e.what(), level::exception);
  } catch (const std::bad_alloc &) {
    append(log, here.exception, "bad allocation", level::exception);  // whatever the runtime's own text is
  } catch (const std::exception &e) {
    append(log, here.exception, e.what(), level::exception);
  } catch (...) {
    append(log, here.unknown, "Unknown failure!", level::unknown_failure);
  }
  return LUMRA_INTERNAL_ERROR;
}

}  // namespace c_support
