// Where a recording is written to. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <span>

namespace recording {

class byte_sink {
 public:
  /// Appends the bytes; throws what its owner throws when it cannot.
  virtual void write(std::span<const std::byte> bytes) = 0;

 protected:
  byte_sink() = default;
  ~byte_sink() = default;
};

}  // namespace recording
