// SPDX-License-Identifier: MIT
#include "platform/processor.hpp"

#include <cpuid.h>
#include <unistd.h>

namespace platform {

bool has_avx() noexcept {
  constexpr std::uint32_t osxsave_and_avx = 1U << 27 | 1U << 28;
  constexpr std::uint32_t sse_and_avx_state = 1U << 1 | 1U << 2;
  std::uint32_t a = 0, b = 0, c = 0, d = 0;
  if (!__get_cpuid_count(1, 0, &a, &b, &c, &d) || (c & osxsave_and_avx) != osxsave_and_avx) return false;
  std::uint32_t xcr0 = 0, high = 0;
  asm volatile("xgetbv" : "=a"(xcr0), "=d"(high) : "c"(0));
  return (xcr0 & sse_and_avx_state) == sse_and_avx_state;
}

std::int32_t processor_count() noexcept {
  const long count = sysconf(_SC_NPROCESSORS_ONLN);
  return count < 1 ? 1 : static_cast<std::int32_t>(count);
}

}  // namespace platform
