// Values of either precision that run side by side in registers: what `f8` is to the kernels. The order of every sum is
// written down, so that no compiler and no processor changes a bit. SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <bit>
#include <cstddef>

namespace toolkit {

/// The upper half is added onto the lower one until one value is left.
template <class T, std::size_t n>
T folded(std::array<T, n> sums) noexcept {
  for (std::size_t half = n / 2; half > 0; half /= 2)
    for (std::size_t l = 0; l < half; ++l) sums[l] += sums[l + half];
  return sums[0];
}

/// n values, 16 bytes times a power of two; 0 in the beginning.
template <class Real, std::size_t n>
class lanes {
 public:
  static lanes load(const Real *from) noexcept {
    lanes v;
    for (std::size_t p = 0; p < parts; ++p) v.part_[p] = *reinterpret_cast<const in_memory *>(from + p * width);
    return v;
  }
  void store(Real *to) const noexcept {
    for (std::size_t p = 0; p < parts; ++p) *reinterpret_cast<in_memory *>(to + p * width) = part_[p];
  }
  [[nodiscard]] std::array<Real, n> values() const noexcept {
    std::array<Real, n> all;
    store(all.data());
    return all;
  }

  /// The same as of the array of values.
  [[nodiscard]] Real folded() const noexcept {
    lanes v = *this;
    for (std::size_t half = parts / 2; half > 0; half /= 2)
      for (std::size_t p = 0; p < half; ++p) v.part_[p] += v.part_[p + half];
    std::array<Real, width> last;
    for (std::size_t l = 0; l < width; ++l) last[l] = v.part_[0][l];
    return toolkit::folded(last);
  }

  lanes &operator+=(const lanes &other) noexcept {
    for (std::size_t p = 0; p < parts; ++p) part_[p] += other.part_[p];
    return *this;
  }
  lanes &operator*=(const lanes &other) noexcept {
    for (std::size_t p = 0; p < parts; ++p) part_[p] *= other.part_[p];
    return *this;
  }
  lanes &operator*=(Real factor) noexcept {
    for (std::size_t p = 0; p < parts; ++p) part_[p] *= factor;
    return *this;
  }
  template <class Factor>
  friend lanes operator*(lanes v, const Factor &factor) noexcept {
    return v *= factor;
  }

 private:
  using part [[gnu::vector_size(16)]] = Real;
  using in_memory [[gnu::vector_size(16), gnu::aligned(alignof(Real)), gnu::may_alias]] = Real;
  static constexpr std::size_t width = sizeof(part) / sizeof(Real), parts = n / width;
  static_assert(n % width == 0 && std::has_single_bit(parts));

  part part_[parts] = {};
};

}  // namespace toolkit
