// The program gives up as reading a recording does: with one sentence. SPDX-License-Identifier: MIT
#pragma once

#include "recording/failure.hpp"

namespace tool {

using recording::failure;
using recording::system_reason;

}  // namespace tool
