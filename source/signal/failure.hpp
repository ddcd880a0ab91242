// Failures of operations that their arguments do not explain. SPDX-License-Identifier: MIT
#pragma once

#include <exception>

namespace dsp {

/// A Fourier transform could not be made or computed.
class transform_failure : public std::exception {
 public:
  /// `reason` is a text that lives for ever.
  transform_failure(const char *reason, bool out_of_memory) noexcept : reason_(reason), out_of_memory_(out_of_memory) {}
  [[nodiscard]] const char *what() const noexcept override { return reason_; }
  [[nodiscard]] bool out_of_memory() const noexcept { return out_of_memory_; }

 private:
  const char *reason_;
  bool out_of_memory_;
};

}  // namespace dsp
