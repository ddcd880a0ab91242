// SPDX-License-Identifier: MIT
#include "open/door.hpp"

#include <algorithm>
#include <cstring>
#include <new>

#include "signal/failure.hpp"

namespace doors {
namespace {

// In the memory that a thread has from its start: looking it up must not allocate, which could fail.
[[gnu::tls_model("initial-exec")]] thread_local char latest[288] = "";

lumra_status keep(const char *function, lumra_status code, std::string_view text) noexcept {
  const auto append = [to = latest](std::string_view part) mutable {
    const auto room = static_cast<std::size_t>(latest + sizeof latest - 1 - to);
    to = std::copy_n(part.data(), std::min(part.size(), room), to);
    *to = '\0';
  };
  auto add = append;
  add(function);
  add(": ");
  add(text);
  return code;
}

}  // namespace

lumra_status keep_failure(const char *function) noexcept {
  try {
    throw;
  } catch (const refusal &reason) {
    return keep(function, reason.code(), reason.text());
  } catch (const dsp::transform_failure &reason) {
    if (!reason.out_of_memory()) return keep(function, LUMRA_TRANSFORM_FAILED, reason.what());
    return keep(function, LUMRA_NO_MEMORY, "not enough memory for a transform; free some, or ask for less");
  } catch (const std::bad_alloc &) {
    return keep(function, LUMRA_NO_MEMORY, "not enough memory; free some, or ask for less");
  } catch (const std::exception &reason) {
    return keep(function, LUMRA_UNEXPECTED, reason.what());
  } catch (...) {
    return keep(function, LUMRA_UNEXPECTED, "an unknown failure");
  }
}

}  // namespace doors

const char *lumra_last_error(void) {
  return doors::latest;
}
