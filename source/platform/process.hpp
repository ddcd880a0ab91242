// The process we are loaded into: symbols, memory, environment. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>

namespace platform {

/// Address of a symbol that the process or one of its global libraries exports, or null.
void *find_symbol(const char *name) noexcept;

/// Keeps the library that holds `address` mapped until the process ends.
void pin_library(void *address) noexcept;

/// True when every byte of the range is mapped and readable. Slow: it reads the process's memory map.
bool is_readable(const void *begin, std::size_t bytes) noexcept;

/// Value of an environment variable, or null.
const char *environment(const char *name) noexcept;
void set_environment(const char *name, const char *value) noexcept;

}  // namespace platform
