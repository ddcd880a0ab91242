// Owned arrays in blocks, as the older interface takes them. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/host_array.h>
#include <lumra/error.hpp>

#include <complex>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <span>
#include <stdexcept>
#include <utility>

namespace lumra {

namespace detail {
template <class T>
struct element;
template <>
struct element<float> {
  using block = lumra_f32_block;
  using matrix_block = lumra_f32_matrix_block;
  static constexpr std::int32_t code = LUMRA_TYPE_F32;
};
template <>
struct element<double> {
  using block = lumra_f64_block;
  using matrix_block = lumra_f64_matrix_block;
  static constexpr std::int32_t code = LUMRA_TYPE_F64;
};
template <>
struct element<std::complex<float>> {
  using block = lumra_cf32_block;
  using matrix_block = lumra_cf32_matrix_block;
  static constexpr std::int32_t code = LUMRA_TYPE_CF32;
};
template <>
struct element<std::complex<double>> {
  using block = lumra_cf64_block;
  using matrix_block = lumra_cf64_matrix_block;
  static constexpr std::int32_t code = LUMRA_TYPE_CF64;
};
}  // namespace detail

/// An owned vector in the library's own memory; T is float, double or std::complex of one of them.
template <class T>
class host_array {
 public:
  using handle = typename detail::element<T>::block **;

  host_array() = default;
  explicit host_array(std::size_t count) {
    const std::int32_t size = checked(count);
    check(qsHost_ArrayNew(detail::element<T>::code, 1, &size, &handle_));
  }
  host_array(host_array &&other) noexcept : handle_(std::exchange(other.handle_, nullptr)) {}
  host_array &operator=(host_array &&other) noexcept {
    std::swap(handle_, other.handle_);
    return *this;
  }
  ~host_array() { qsHost_ArrayFree(&handle_); }

  /// The elements; valid until the array is resized, by a call that writes it too.
  [[nodiscard]] std::span<T> elements() noexcept { return {data(), size()}; }
  [[nodiscard]] std::span<const T> elements() const noexcept { return {data(), size()}; }
  [[nodiscard]] std::size_t size() const noexcept {
    return has_block() ? static_cast<std::size_t>((*handle_)->count) : 0;
  }

  /// Keeps the elements up to the smaller of the two counts; new ones are zero.
  void resize(std::size_t count) {
    const std::int32_t wanted = checked(count);
    const std::size_t before = size();
    check(qsHost_ArrayResize(detail::element<T>::code, 1, &handle_, count));
    (*handle_)->count = wanted;
    for (T &fresh : elements().subspan(before < count ? before : count)) fresh = T{};
  }

  /// The handle that C functions take; `address` where they may make a new one.
  [[nodiscard]] handle get() const noexcept { return handle_; }
  [[nodiscard]] handle *address() noexcept { return &handle_; }
  [[nodiscard]] handle release() noexcept { return std::exchange(handle_, nullptr); }

 private:
  static std::int32_t checked(std::size_t count) {
    if (count > static_cast<std::size_t>(std::numeric_limits<std::int32_t>::max()))
      throw std::length_error("host_array");
    return static_cast<std::int32_t>(count);
  }
  [[nodiscard]] bool has_block() const noexcept { return handle_ && *handle_; }
  [[nodiscard]] T *data() const noexcept { return has_block() ? reinterpret_cast<T *>((*handle_)->elements) : nullptr; }

  handle handle_ = nullptr;
};

/// An owned matrix in the library's own memory, row by row; T as for host_array.
template <class T>
class host_matrix {
 public:
  using handle = typename detail::element<T>::matrix_block **;

  host_matrix() = default;
  host_matrix(std::size_t rows, std::size_t columns) { resize(rows, columns); }
  host_matrix(host_matrix &&other) noexcept : handle_(std::exchange(other.handle_, nullptr)) {}
  host_matrix &operator=(host_matrix &&other) noexcept {
    std::swap(handle_, other.handle_);
    return *this;
  }
  ~host_matrix() { qsHost_ArrayFree(&handle_); }

  /// The elements, row after row; valid until the matrix is resized.
  [[nodiscard]] std::span<T> elements() noexcept { return {data(), size()}; }
  [[nodiscard]] std::span<const T> elements() const noexcept { return {data(), size()}; }
  [[nodiscard]] std::span<T> row(std::size_t r) noexcept { return elements().subspan(r * columns(), columns()); }
  [[nodiscard]] std::size_t rows() const noexcept {
    return has_block() ? static_cast<std::size_t>((*handle_)->rows) : 0;
  }
  [[nodiscard]] std::size_t columns() const noexcept {
    return has_block() ? static_cast<std::size_t>((*handle_)->columns) : 0;
  }
  [[nodiscard]] std::size_t size() const noexcept { return rows() * columns(); }

  /// The first elements, row after row, stay the first ones whatever the new rows are; new ones are zero.
  void resize(std::size_t rows, std::size_t columns) {
    constexpr auto most = static_cast<std::size_t>(std::numeric_limits<std::int32_t>::max());
    if (rows > most || columns > most || (columns > 0 && rows > most / columns)) throw std::length_error("host_matrix");
    const std::size_t before = size();
    const std::size_t count = rows * columns;
    check(qsHost_ArrayResize(detail::element<T>::code, 2, &handle_, count));
    (*handle_)->rows = static_cast<std::int32_t>(rows);
    (*handle_)->columns = static_cast<std::int32_t>(columns);
    for (T &fresh : elements().subspan(before < count ? before : count)) fresh = T{};
  }

  /// The handle that C functions take.
  [[nodiscard]] handle get() const noexcept { return handle_; }

 private:
  [[nodiscard]] bool has_block() const noexcept { return handle_ && *handle_; }
  [[nodiscard]] T *data() const noexcept { return has_block() ? reinterpret_cast<T *>((*handle_)->elements) : nullptr; }

  handle handle_ = nullptr;
};

}  // namespace lumra
