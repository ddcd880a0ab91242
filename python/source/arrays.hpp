// NumPy's arrays as the library takes them: read in place with any distance between samples, written in place.
// SPDX-License-Identifier: MIT
#pragma once

#include <lumra/types.h>
#include <pybind11/numpy.h>

#include <algorithm>
#include <complex>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <string>
#include <type_traits>
#include <vector>

#include "computing.hpp"
#include "failures.hpp"

namespace binding {

/// What the library computes with.
enum class element : std::int32_t {
  f32 = LUMRA_TYPE_F32,
  f64 = LUMRA_TYPE_F64,
  cf32 = LUMRA_TYPE_CF32,
  cf64 = LUMRA_TYPE_CF64
};

constexpr bool is_complex(element type) noexcept {
  return type == element::cf32 || type == element::cf64;
}
constexpr bool is_single(element type) noexcept {
  return type == element::f32 || type == element::cf32;
}
constexpr element of(bool complex, bool single) noexcept {
  return complex ? single ? element::cf32 : element::cf64 : single ? element::f32 : element::f64;
}
constexpr element complex_of(element type) noexcept {
  return of(true, is_single(type));
}
constexpr element real_of(element type) noexcept {
  return of(false, is_single(type));
}
constexpr py::ssize_t bytes_of(element type) noexcept {
  return py::ssize_t{is_single(type) ? 4 : 8} * (is_complex(type) ? 2 : 1);
}
py::dtype dtype_of(element type);
/// NumPy's name of it.
const char *name_of(element type) noexcept;

/// Calls work with a std::type_identity of the type's C++ type.
template <class Work>
decltype(auto) with_type(element type, Work work) {
  switch (type) {
    case element::f32:
      return work(std::type_identity<float>{});
    case element::f64:
      return work(std::type_identity<double>{});
    case element::cf32:
      return work(std::type_identity<std::complex<float>>{});
    default:
      return work(std::type_identity<std::complex<double>>{});
  }
}

/// The object as an array of numbers, and which type it is computed in: integers and what has no type of its own in
/// double precision. Throws TypeError, ValueError.
struct numbers {
  numbers(py::handle object, const char *name);

  py::array array;
  element type;
  const char *name;

  /// In another type, which is complex where the array is, aligned and in the machine's byte order: the array itself
  /// where it is that already.
  [[nodiscard]] py::array as(element wanted) const;
};

/// One dimension of numbers of one type. The GIL is held where one is made or ends.
class samples {
 public:
  samples(py::handle object, const char *name) : samples(numbers(object, name)) {}
  explicit samples(const numbers &of) : samples(of, of.type) {}
  samples(const numbers &of, element wanted);

  [[nodiscard]] element type() const noexcept { return type_; }
  [[nodiscard]] std::size_t size() const noexcept { return size_; }
  [[nodiscard]] const py::array &array() const noexcept { return array_; }
  /// From a sample to the next, in samples.
  [[nodiscard]] std::ptrdiff_t step() const noexcept { return step_; }
  template <class T>
  [[nodiscard]] const T *first() const noexcept {
    return static_cast<const T *>(data_);
  }
  /// The samples side by side, in memory of their own where they were not.
  void gather();
  /// Reads from memory of its own.
  void copy();

 private:
  void look();

  py::array array_;
  element type_;
  const void *data_ = nullptr;
  std::ptrdiff_t step_ = 1;
  std::size_t size_ = 0;
};

/// A new array.
py::array new_array(element type, const std::vector<py::ssize_t> &shape);
py::array new_array(element type, std::size_t size);

/// Where a result goes: into a new array, or what `out` names. The library writes to memory without gaps, and in place
/// only where input and output are one; for any other `out` it writes beside it, and finish() copies.
class target {
 public:
  /// Throws TypeError and ValueError where `out` has another type or shape, or is read-only.
  target(py::handle out, element type, const std::vector<py::ssize_t> &shape,
         std::initializer_list<const py::array *> inputs);

  template <class T>
  [[nodiscard]] T *first() noexcept {
    return static_cast<T *>(data_);
  }
  [[nodiscard]] const py::array &array() const noexcept { return written_; }
  /// The array to give.
  py::array finish();

 private:
  py::array given_, written_;
  void *data_;
};

/// Elements of a piece that is gathered from strided memory.
inline constexpr std::size_t gathered = std::size_t{1} << 15;

template <class T>
void gather(const T *from, std::ptrdiff_t step, T *to, std::size_t count) noexcept {
  for (std::size_t i = 0; i < count; ++i) to[i] = from[static_cast<std::ptrdiff_t>(i) * step];
}

/// Calls work(pointer, count) with the samples from front to back, at most `most` at once: in place where they lie side
/// by side. Without the GIL.
template <class T, class Work>
void in_pieces(const samples &x, std::size_t most, Work work) {
  interruptions signals;
  std::vector<T> buffer(x.step() == 1 ? 0 : std::min({x.size(), most, gathered}));
  const std::size_t piece = x.step() == 1 ? most : buffer.size();
  for (std::size_t done = 0; done < x.size();) {
    const std::size_t count = std::min(piece, x.size() - done);
    const T *from = x.first<T>() + static_cast<std::ptrdiff_t>(done) * x.step();
    if (x.step() != 1) {
      gather(from, x.step(), buffer.data(), count);
      from = buffer.data();
    }
    work(from, count);
    done += count;
    if (done < x.size()) signals.poll();
  }
}

}  // namespace binding
