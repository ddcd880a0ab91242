// SPDX-License-Identifier: MIT
#include "platform/processor.hpp"

#include <cpuid.h>
#include <unistd.h>

namespace platform {
namespace {

constexpr std::uint32_t bit(int n) noexcept {
  return std::uint32_t{1} << n;
}

/// The registers of a leaf of the processor's description of itself; zeros for a leaf that it does not have.
struct leaf {
  std::uint32_t a = 0, b = 0, c = 0, d = 0;
  explicit leaf(std::uint32_t number) noexcept {
    if (!__get_cpuid_count(number, 0, &a, &b, &c, &d)) a = b = c = d = 0;
  }
};

constexpr bool has_all(std::uint32_t bits, std::uint32_t wanted) noexcept {
  return (bits & wanted) == wanted;
}

/// Whether the operating system saves these registers: bits of the extended control register 0.
bool saves(const leaf &first, std::uint32_t registers) noexcept {
  constexpr std::uint32_t osxsave = bit(27);
  if (!has_all(first.c, osxsave)) return false;
  std::uint32_t low = 0, high = 0;
  asm volatile("xgetbv" : "=a"(low), "=d"(high) : "c"(0));
  return has_all(low, registers);
}

constexpr std::uint32_t sse_and_avx_state = bit(1) | bit(2);
constexpr std::uint32_t mask_and_zmm_state = bit(5) | bit(6) | bit(7);

}  // namespace

bool has_avx() noexcept {
  constexpr std::uint32_t avx = bit(28);
  const leaf first(1);
  return has_all(first.c, avx) && saves(first, sse_and_avx_state);
}

bool has_avx2() noexcept {
  constexpr std::uint32_t fma = bit(12), avx2 = bit(5);
  return has_avx() && has_all(leaf(1).c, fma) && has_all(leaf(7).b, avx2);
}

bool has_avx512() noexcept {
  constexpr std::uint32_t foundation = bit(16), double_and_quad = bit(17), byte_and_word = bit(30), shorter = bit(31);
  return has_avx2() && has_all(leaf(7).b, foundation | double_and_quad | byte_and_word | shorter) &&
         saves(leaf(1), sse_and_avx_state | mask_and_zmm_state);
}

std::int32_t processor_count() noexcept {
  const long count = sysconf(_SC_NPROCESSORS_ONLN);
  return count < 1 ? 1 : static_cast<std::int32_t>(count);
}

}  // namespace platform
