// The core's exceptions. The boundary turns them into status codes and log entries. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <exception>
#include <string>
#include <utility>

namespace qsrfhs {

/// A place as the log names it. Data of the interface: it stays when code moves.
struct source_position {
  const char *file;  // static storage
  std::int32_t line;
};

class error : public std::exception {
 public:
  error(source_position at, std::int32_t status_code) noexcept : line(at.line), file(at.file), code(status_code) {}
  [[nodiscard]] const char *what() const noexcept override { return "Unknown exception"; }

  std::int32_t line;
  const char *file;
  std::int32_t code;  // session-interface code that describes the failure
};

/// An argument that the core cannot serve.
class invalid_argument : public error {
 public:
  using error::error;
};

/// An MKL call failed.
class mkl_error : public error {
 public:
  mkl_error(source_position at, std::int32_t status_code, std::int32_t mkl_status, std::string mkl_message)
      : error(at, status_code), status(mkl_status), message(std::move(mkl_message)) {}
  [[nodiscard]] const char *what() const noexcept override { return message.c_str(); }

  std::int32_t status;
  std::string message;  // MKL's own text for the status
};

}  // namespace qsrfhs
