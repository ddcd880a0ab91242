// What the processor can do, and how many there are. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

namespace platform {

// True when the processor has the instructions and the operating system saves their registers. Each needs those above.

bool has_avx() noexcept;
/// AVX2 and fused multiply-add.
bool has_avx2() noexcept;
/// AVX-512 with its instructions for bytes, words, double and quad words and for shorter registers.
bool has_avx512() noexcept;

/// Processors online, at least 1.
std::int32_t processor_count() noexcept;

}  // namespace platform
