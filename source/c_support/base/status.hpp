// The session interface's status codes and their messages. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/status.h>

#include <cstdint>

namespace c_support {

/// The code itself when this interface knows it, else LUMRA_UNKNOWN_CODE. 0 is not known: success has no message.
std::int32_t NormalizeStatusCode(std::int32_t code) noexcept;

/// Message of a code, never null; static storage.
const char *GetStatusMessage(std::int32_t code) noexcept;

}  // namespace c_support
