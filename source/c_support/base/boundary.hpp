// Where exceptions end: every session export runs its work in here. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <utility>

#include "qsrfhs/math/exceptions.hpp"
#include "qsrfhs/util/log.hpp"

namespace c_support {

/// Positions that the log names for failures without one of their own; data of the interface.
struct catch_positions {
  qsrfhs::source_position exception;
  qsrfhs::source_position unknown;
};

/// Status code of the exception being handled, with an entry in the log where there is one.
std::int32_t translate_current_exception(qsrfhs::log::Logger *log, const catch_positions *at) noexcept;

/// Runs work; whatever it throws becomes LUMRA_INTERNAL_ERROR or LUMRA_INVALID_ARGUMENT, without a log entry.
template <class Work>
std::int32_t at_boundary(Work &&work) noexcept {
  try {
    return std::forward<Work>(work)();
  } catch (...) {
    return translate_current_exception(nullptr, nullptr);
  }
}

}  // namespace c_support
