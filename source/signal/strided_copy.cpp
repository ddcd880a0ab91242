// SPDX-License-Identifier: MIT
#include "signal/strided_copy.hpp"

#include <emmintrin.h>

#include <complex>
#include <cstring>
#include <type_traits>
#include <utility>

namespace dsp {
namespace {

/// A rectangle of elements goes line by line. `next` leads from an element to the next of its line, `line` to the next
/// line, both in bytes.
struct strides {
  std::int64_t next, line;
  [[nodiscard]] std::int64_t offset(std::size_t i, std::size_t k) const noexcept {
    return static_cast<std::int64_t>(i) * next + static_cast<std::int64_t>(k) * line;
  }
};

struct rectangle {
  std::size_t begin, end;               // within a line
  std::size_t first_line, behind_line;  // lines
};

template <class Element>
void copy_one_by_one(const std::byte *in, strides from, std::byte *out, strides to, const rectangle &r) noexcept {
  for (std::size_t k = r.first_line; k < r.behind_line; ++k)
    for (std::size_t i = r.begin; i < r.end; ++i)
      std::memcpy(out + to.offset(i, k), in + from.offset(i, k), sizeof(Element));
}

__m128i load(const std::byte *p) noexcept {
  return _mm_loadu_si128(reinterpret_cast<const __m128i *>(p));
}

void store(std::byte *p, __m128i a) noexcept {
  _mm_storeu_si128(reinterpret_cast<__m128i *>(p), a);
}

/// Elements of 4 bytes, four by four: what stood side by side, `in_line` bytes from line to line, becomes lines.
void transpose(std::integral_constant<std::size_t, 4>, const std::byte *in, std::int64_t in_line, std::byte *out,
               std::int64_t out_line) noexcept {
  const __m128i a = load(in), b = load(in + in_line), c = load(in + 2 * in_line), d = load(in + 3 * in_line);
  const __m128i ab = _mm_unpacklo_epi32(a, b), cd = _mm_unpacklo_epi32(c, d);
  const __m128i ab_high = _mm_unpackhi_epi32(a, b), cd_high = _mm_unpackhi_epi32(c, d);
  store(out, _mm_unpacklo_epi64(ab, cd));
  store(out + out_line, _mm_unpackhi_epi64(ab, cd));
  store(out + 2 * out_line, _mm_unpacklo_epi64(ab_high, cd_high));
  store(out + 3 * out_line, _mm_unpackhi_epi64(ab_high, cd_high));
}

/// Elements of 8 bytes, two by two.
void transpose(std::integral_constant<std::size_t, 8>, const std::byte *in, std::int64_t in_line, std::byte *out,
               std::int64_t out_line) noexcept {
  const __m128i a = load(in), b = load(in + in_line);
  store(out, _mm_unpacklo_epi64(a, b));
  store(out + out_line, _mm_unpackhi_epi64(a, b));
}

/// Whether elements that are side by side in one memory are a line apart in the other, where lines are side by side.
bool is_transposed(strides from, strides to, std::size_t size) noexcept {
  const auto side_by_side = static_cast<std::int64_t>(size);
  return (from.next == side_by_side && to.line == side_by_side) ||
         (from.line == side_by_side && to.next == side_by_side);
}

template <class Element>
void copy(const std::byte *in, strides from, std::byte *out, strides to, std::size_t count,
          std::size_t lines) noexcept {
  constexpr std::size_t size = sizeof(Element), tile = sizeof(__m128i) / size;
  std::size_t tiled_count = 0, tiled_lines = 0;
  if constexpr (tile > 1) {
    if (is_transposed(from, to, size)) {
      tiled_count = count / tile * tile;
      tiled_lines = lines / tile * tile;
      const bool gathers = from.next == static_cast<std::int64_t>(size);
      for (std::size_t k = 0; k < tiled_lines; k += tile)
        for (std::size_t i = 0; i < tiled_count; i += tile)
          transpose(std::integral_constant<std::size_t, size>(), in + from.offset(i, k),
                    gathers ? from.line : from.next, out + to.offset(i, k), gathers ? to.next : to.line);
    }
  }
  copy_one_by_one<Element>(in, from, out, to, {tiled_count, count, 0, tiled_lines});
  copy_one_by_one<Element>(in, from, out, to, {0, count, tiled_lines, lines});
}

}  // namespace

void copy_rows(const std::byte *in, row_layout from, std::byte *out, row_layout to, const row_shape &shape,
               std::size_t rows) noexcept {
  const auto size = static_cast<std::int64_t>(shape.size);
  if (from.step == 1 && to.step == 1) {
    const strides a{0, from.distance * size}, b{0, to.distance * size};
    for (std::size_t r = 0; r < rows; ++r) std::memcpy(out + b.offset(0, r), in + a.offset(0, r), shape.bytes());
    return;
  }
  strides a{from.step * size, from.distance * size}, b{to.step * size, to.distance * size};
  std::size_t count = shape.count, lines = rows;
  if (from.interleaved() || to.interleaved()) {  // neighbours lie in different rows
    std::swap(a.next, a.line);
    std::swap(b.next, b.line);
    std::swap(count, lines);
  }
  switch (shape.size) {
    case sizeof(float):
      return copy<float>(in, a, out, b, count, lines);
    case sizeof(double):
      return copy<double>(in, a, out, b, count, lines);
    default:
      return copy<std::complex<double>>(in, a, out, b, count, lines);
  }
}

}  // namespace dsp
