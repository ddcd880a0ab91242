// What the processor can do, and how many there are. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

namespace platform {

/// True when the processor has AVX and the operating system saves its registers.
bool has_avx() noexcept;

/// Processors online, at least 1.
std::int32_t processor_count() noexcept;

}  // namespace platform
