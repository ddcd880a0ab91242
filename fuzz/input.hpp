// The bytes of one input as numbers and choices. Behind its end all are zero, so that every prefix is an input, too.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
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

/// What a target does with one input.
void run(input &in);

}  // namespace fuzz
