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
  explicit error(source_position at) noexcept : position(at) {}
  [[nodiscard]] const char *what() const noexcept override { return "Unknown exception"; }

  source_position position;
};

/// An argument that the core cannot serve.
class invalid_argument : public error {
 public:
  using error::error;
};

/// An MKL call failed.
class mkl_error : public error {
 public:
  mkl_error(source_position at, std::string mkl_message) : error(at), message(std::move(mkl_message)) {}
  [[nodiscard]] const char *what() const noexcept override { return message.c_str(); }

  std::string message;  // MKL's own text for its status
};

}  // namespace qsrfhs
