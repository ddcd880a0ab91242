// SPDX-License-Identifier: MIT
#include "c_support/base/boundary.hpp"

#include <lumra/status.h>

#include <new>

namespace c_support {
namespace {

/// A log that has no memory for the entry loses it; the status code still reaches the caller.
void append(qsrfhs::log::Logger *log, qsrfhs::source_position at, const char *text) noexcept {
  if (!log) return;
  try {
    log->add({at.line, at.file, text});
  } catch (...) {
    return;
  }
}

}  // namespace

std::int32_t translate_current_exception(qsrfhs::log::Logger *log, const catch_positions *at) noexcept {
  const catch_positions here = at ? *at : catch_positions{};
  try {
    throw;
  } catch (const qsrfhs::invalid_argument &e) {
    append(log, e.position, e.what());
    return LUMRA_INVALID_ARGUMENT;
  } catch (const qsrfhs::error &e) {
    append(log, e.position, e.what());
  } catch (const std::bad_alloc &) {
    append(log, here.exception, "bad allocation");  // whatever the runtime's own text is
  } catch (const std::exception &e) {
    append(log, here.exception, e.what());
  } catch (...) {
    append(log, here.unknown, "Unknown failure!");
  }
  return LUMRA_INTERNAL_ERROR;
}

}  // namespace c_support
