// The bytes of one input as numbers and choices. Behind its end all are zero, so that every prefix is an input, too.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <limits>

namespace fuzz {

/// Ends the process, which is a finding, unless the condition holds.
inline void hold(bool condition, const char *what, int line = __builtin_LINE()) {
  if (condition) return;
  std::fprintf(stderr, "line %d: %s\n", line, what);
  std::abort();
}

class input {
 public:
  input(const unsigned char *data, std::size_t size) noexcept : data_(data), size_(size) {}

  [[nodiscard]] bool left() const noexcept { return size_ != 0; }
  unsigned byte() noexcept { return left() ? (--size_, *data_++) : 0; }
  unsigned choice(unsigned n) noexcept { return byte() % n; }
  bool one_in(unsigned n) noexcept { return choice(n) == n - 1; }
  bool flag() noexcept { return one_in(2); }

  template <class T>
  T raw() noexcept {
    T value{};
    const std::size_t taken = std::min(sizeof value, size_);
    std::memcpy(&value, data_, taken);
    data_ += taken;
    size_ -= taken;
    return value;
  }
  /// Numbers of elements: small ones, around the widths of loops, and now and then up to two thousand.
  int count() noexcept {
    const auto b = static_cast<int>(byte());
    return b < 128 ? b % 20 : b < 224 ? b - 96 : static_cast<int>(byte()) * 8 + b - 224;
  }
  /// An option whose valid values lie below n, and some of those that do not.
  std::int32_t option(unsigned n) noexcept {
    const unsigned b = byte();
    return b < 240 ? static_cast<std::int32_t>(b % n) : extreme(b);
  }
  static std::int32_t extreme(unsigned b) noexcept {
    constexpr auto most = std::numeric_limits<std::int32_t>::max();
    constexpr std::int32_t values[] = {-1, most, -most - 1, -2, 3, (1 << 27) + 1, 1 << 30, 99};
    return values[b % 8];
  }
  /// From -1 to 1, or a special value.
  double real() noexcept {
    constexpr double infinity = std::numeric_limits<double>::infinity();
    constexpr double special[] = {0,     -0.0,   infinity, -infinity, std::numeric_limits<double>::quiet_NaN(),
                                  1e-45, -1e-40, 3.4e38,   -3.4e38,   5e-324,
                                  1e308, 1e9,    2.5,      1.2e-38,   1.0,
                                  -1};
    const unsigned b = byte();
    return b >= 240 ? special[b - 240] : (static_cast<double>(b) - 120) / 120;
  }

 private:
  const unsigned char *data_;
  std::size_t size_;
};

/// Noise, with special values among it or without, or the input's own bytes. Whether all are tame.
template <class T>
bool fill(input &in, char *to, std::size_t n) {
  const unsigned style = in.choice(5);
  std::uint32_t seed = style < 4 ? in.byte() : 0;
  bool tame = true;
  for (std::size_t i = 0; i < n; ++i) {
    seed = seed * 1664525U + 1013904223U;
    T value = static_cast<T>(static_cast<float>(seed >> 8) / 8388608.F - 1.F);
    if (style == 3 && seed % 3 == 0) {
      value = static_cast<T>(in.left() ? in.real() : 0);
    } else if (style == 4) {
      value = in.raw<T>();
    }
    tame = tame && (value == 0 || (std::abs(value) <= 1 && std::abs(value) >= T(1e-9)));
    std::memcpy(to + i * sizeof value, &value, sizeof value);
  }
  return tame;
}

/// What a target does with one input.
void run(input &in);

}  // namespace fuzz
