// Statuses, and the exception that carries one. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/status.h>

#include <cstddef>
#include <cstdint>
#include <stdexcept>
#include <string>

namespace lumra {

/// A status code with what it means.
class status {
 public:
  constexpr status() noexcept = default;
  constexpr explicit status(std::int32_t code) noexcept : code_(code) {}

  [[nodiscard]] constexpr bool ok() const noexcept { return code_ == LUMRA_SUCCESS; }
  [[nodiscard]] constexpr std::int32_t code() const noexcept { return code_; }
  /// Its name in enum lumra_status; empty for a code without one.
  [[nodiscard]] const char *name() const noexcept { return lumra_status_name(code_); }
  [[nodiscard]] std::string message() const { return lumra_status_text(code_); }

  friend constexpr bool operator==(status, status) noexcept = default;

 private:
  std::int32_t code_ = LUMRA_SUCCESS;
};

/// A failure: its status, and a sentence that says what happened.
class error : public std::runtime_error {
 public:
  explicit error(lumra::status status) : error(status, status.message()) {}
  error(lumra::status status, const std::string &sentence) : std::runtime_error(sentence), status_(status) {}
  [[nodiscard]] lumra::status status() const noexcept { return status_; }

 private:
  lumra::status status_;
};

/// Throws the calling thread's latest failure of the open interface for a code other than 0.
inline void check_open(lumra_status code) {
  if (code != LUMRA_SUCCESS) throw error(status(code), lumra_last_error());
}

/// Throws lumra::error for a negative code.
inline void check(std::int32_t code) {
  if (code < 0) throw error(status(code));
}

}  // namespace lumra
