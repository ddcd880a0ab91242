// Linear convolution of plain vectors and matrices, directly and through Fourier transforms. The families of
// convolution and correlation are this plus sizes and orders. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstdint>
#include <span>

#include "toolkit/arithmetic.hpp"
#include "toolkit/frame.hpp"
#include "toolkit/transform_slot.hpp"

namespace toolkit {

enum class method : std::int32_t { direct = 0, fourier = 1 };

/// How a record enters a convolution: as it stands, or, for a correlation, reversed and conjugated.
enum class order { forward, reversed };

/// Throws bad_option for a number that is no method.
inline method checked_method(std::int32_t number) {
  require(number == 0 || number == 1, bad_option);
  return static_cast<method>(number);
}

/// Smallest number not below `least` without prime factors above 7.
constexpr std::int64_t smooth_length(std::int64_t least) noexcept {
  for (std::int64_t n = least;; ++n) {
    std::int64_t rest = n;
    for (const int prime : {7, 5, 3, 2})
      while (rest % prime == 0) rest /= prime;
    if (rest == 1) return n;
  }
}

/// Copies a record, of the same or of the real type, to the front of `to` and returns what lies behind it.
template <class T, class U>
T *copy_record(const U *x, std::int64_t n, order order, T *to) noexcept {
  if (order == order::forward) return std::copy_n(x, n, to);
  if constexpr (std::is_same_v<T, U>)
    reverse_conjugate(x, to, n);
  else
    std::reverse_copy(x, x + n, to);
  return to + n;
}

inline constexpr std::int32_t default_block = 100'000;

/// out += a * b (convolution), the shorter record sample by sample over the longer one in pieces of `block` samples.
/// The order of the sums in one element does not depend on the block.
template <class T>
void add_convolution(std::span<const T> a, std::span<const T> b, std::int32_t block, T *out) noexcept {
  constexpr std::size_t worth_a_call = 25;
  if (a.size() > b.size()) std::swap(a, b);
  if (block < 1) block = default_block;
  for (std::size_t i = 0; i < a.size(); ++i) {
    if (b.size() < worth_a_call) {
      for (std::size_t j = 0; j < b.size(); ++j) out[i + j] += product(a[i], b[j]);
      continue;
    }
    for (std::size_t done = 0; done < b.size(); done += static_cast<std::size_t>(block)) {
      const std::size_t piece = std::min(b.size() - done, static_cast<std::size_t>(block));
      axpy(static_cast<std::int32_t>(piece), a[i], b.data() + done, out + i + done);
    }
  }
}

/// Fills a zero-padded record of one row.
template <class U>
struct padded_vector {
  std::span<const U> from;
  order in = order::forward;

  template <class T>
  void operator()(T *to, std::int64_t columns) const noexcept {
    std::fill(copy_record(from.data(), static_cast<std::int64_t>(from.size()), in, to), to + columns, T{});
  }
};

/// The zero-padded record, both spectra, and the result of a Fourier convolution, all in the caller's scratch. Matrices
/// have rows, vectors one row.
template <class E>
class fourier_convolution {
 public:
  using value = value_of<E>;
  using bin = value_of<complex_of<E>>;

  /// Throws no_transform when there are more points than a transform may have. Sizes nothing.
  explicit fourier_convolution(std::int64_t length)
      : rows_(1), columns_(checked(length)), settings_(transform_settings<E>(columns_, 0, scaling::backward)) {}
  fourier_convolution(std::int64_t rows, std::int64_t columns)
      : rows_(checked(rows)),
        columns_(checked(columns)),
        settings_(transform_settings<E>(rows_, columns_, scaling::backward)) {
    check_transform_size(rows_ * columns_);
  }

  /// load_x and load_y fill a zero-padded record: load(first element, elements per row). Without load_y, x is
  /// convolved with itself. Returns the first element of the result, which has as many columns as the padded record.
  template <class LoadX, class... LoadY>
  const value *run(scratch<E> &room, transform_slot &slot, LoadX load_x, LoadY... load_y) const {
    static_assert(sizeof...(LoadY) <= 1);
    const std::int64_t record_size = padded(rows_ * columns_);
    const std::int64_t spectrum_size =
        is_complex<E> ? record_size : padded(rows_ == 1 ? columns_ + 2 : 2 * record_size);
    const std::int64_t behind_first = record_size + std::int64_t{sizeof...(LoadY)} * spectrum_size;
    value *const record = room.resize(behind_first + spectrum_size).data();
    bin *const of_x = reinterpret_cast<bin *>(record + record_size);
    bin *const of_y = reinterpret_cast<bin *>(record + behind_first);

    const dsp::dfti_descriptor &fourier = slot.get(settings_);
    const auto transform = [&](auto &load, bin *spectrum) {
      load(record, columns_);
      fourier.forward(record, spectrum);
    };
    transform(load_x, of_x);
    (transform(load_y, of_y), ...);
    const std::int64_t used = is_complex<E> ? columns_ : columns_ / 2 + 1;
    for (std::int64_t r = 0; r < rows_; ++r) multiply(of_x + r * columns_, of_y + r * columns_, used);
    fourier.backward(of_x, record);
    return record;
  }
  [[nodiscard]] std::int64_t rows() const noexcept { return rows_; }
  [[nodiscard]] std::int64_t columns() const noexcept { return columns_; }

 private:
  static std::int64_t checked(std::int64_t length) {
    check_transform_size(length);
    length = smooth_length(length);
    check_transform_size(length);
    return length;
  }
  /// Keeps what follows on a 64-byte boundary.
  static std::int64_t padded(std::int64_t n) noexcept { return (n + 15) / 16 * 16; }

  std::int64_t rows_, columns_;
  dsp::dfti_settings settings_;
};

}  // namespace toolkit
