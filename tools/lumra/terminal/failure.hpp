// The program gives up as reading a recording does: with one sentence. SPDX-License-Identifier: MIT
#pragma once

#include "recording/failure.hpp"

namespace tool {

using recording::failure;
using recording::system_reason;

/// What stands on the command line makes no sense; the sentence names the word.
class wrong_usage : public failure {
 public:
  using failure::failure;
};

}  // namespace tool
