// What all toolkit functions share: how arrays are read and sized, and what a failure leaves behind.
//
// An operation throws `failure`; toolkit_call turns that into the status and empties the outputs. Scratch arrays empty
// themselves. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstdint>
#include <exception>
#include <limits>
#include <span>
#include <utility>

#include "host/resize_service.hpp"
#include "qsrfhs/math/mkl_memory.hpp"
#include "qsrfhs/math/mkl_runtime.hpp"
#include "qsrfhs/util/aligned_buffer.hpp"
#include "toolkit/element.hpp"

namespace toolkit {

enum status : std::int32_t {
  success = 0,
  no_memory = -20001,
  lengths_differ = -20002,
  empty_input = -20003,
  negative_dimension = -20004,
  too_few_points = -20006,
  empty_result = -20008,
  bad_ratio = -20016,
  bad_factor = -20022,
  inner_dimensions_differ = -20039,
  destination_too_small = -20046,
  negative_delay = -20059,
  bad_option = -20061,
  not_finite = -20068,
  history_too_short = -20075,
  no_scratch = -20999,
  transform_failed = -359501,
  no_transform = -359502,
  transform_not_freed = -359503,
};

class failure : public std::exception {
 public:
  explicit failure(status code) noexcept : code_(code) {}
  [[nodiscard]] status code() const noexcept { return code_; }
  [[nodiscard]] const char *what() const noexcept override { return "toolkit failure"; }

 private:
  status code_;
};

/// Throws the failure unless the condition holds.
inline void require(bool condition, status otherwise) {
  if (!condition) throw failure(otherwise);
}

/// Status of the exception being handled. What a host's resize service throws counts as a refusal.
std::int32_t status_of_current_exception() noexcept;

namespace detail {

template <class E>
std::span<value_of<E>> values(handle<E> array) noexcept {
  const auto elements = host::elements(array);
  return {reinterpret_cast<value_of<E> *>(elements.data()), elements.size()};
}

/// Elements of a matrix by its sizes; -1 when one of them is negative.
template <class Block>
std::int64_t product(const Block &matrix) noexcept {
  return matrix.rows < 0 || matrix.columns < 0 ? -1 : std::int64_t{matrix.rows} * matrix.columns;
}

template <class E>
std::span<value_of<E>> values(matrix_handle<E> array) noexcept {
  if (!host::has_block(array) || product(**array) < 0) return {};
  return {reinterpret_cast<value_of<E> *>((*array)->elements), static_cast<std::size_t>(product(**array))};
}

/// Empties an array; its sizes become 0 even when the resize is refused.
template <class Block>
void clear_vector(Block **array) noexcept {
  if (!host::has_block(array)) return;
  try {
    host::resize_vector(&array, 0, 0);
  } catch (...) {  // a refusal, below
  }
  if (host::has_block(array)) (*array)->count = 0;
}

}  // namespace detail

/// Which array an argument is, whatever its element type. Two are one array when they are one handle, also where that
/// has no block yet, or when their handles hold one block: sizing the one then moves or frees what the other one means.
class identity {
 public:
  template <class Block>
  explicit identity(Block *const *handle) noexcept : handle_(handle), block_(handle ? *handle : nullptr) {}

  [[nodiscard]] bool has_block() const noexcept { return block_ != nullptr; }
  friend bool operator==(const identity &a, const identity &b) noexcept {
    return (a.handle_ && a.handle_ == b.handle_) || (a.block_ && a.block_ == b.block_);
  }

 private:
  const void *handle_, *block_;
};

/// Whether two arguments of a call, as they are now, are one array.
template <class First, class Second>
bool same_array(const First &first, const Second &second) noexcept {
  return first.which() == second.which();
}

/// Throws bad_option when a workspace or a state is also another array of the call: sizing it would pull that away.
template <class Array, class... Others>
void refuse_sharing(const Array &array, const Others &...others) {
  require(!(same_array(array, others) || ...), bad_option);
}

/// A rectangle of elements, row by row.
template <class T>
struct matrix_view {
  T *data = nullptr;
  std::int32_t rows = 0, columns = 0;

  [[nodiscard]] std::size_t size() const noexcept {
    return static_cast<std::size_t>(rows) * static_cast<std::size_t>(columns);
  }
  [[nodiscard]] T *row(std::int32_t r) const noexcept { return data + std::int64_t{r} * columns; }
};

/// Elements that are only read, of the array that they are in or, once that is about to be overwritten, of a copy.
template <class E>
class read_only {
 public:
  [[nodiscard]] std::span<const value_of<E>> values() const noexcept { return values_; }
  [[nodiscard]] identity which() const noexcept { return which_; }

  /// Reads a copy from here on if `written`, which is about to be sized, is the same array.
  template <class Array>
  void copy_if_same(const Array &written) {
    if (!same_array(*this, written)) return;
    copy_ = qsrfhs::aligned_buffer<value_of<E>>(values_.size());
    std::copy(values_.begin(), values_.end(), copy_.data());
    values_ = copy_.elements();
  }

 protected:
  read_only(identity which, std::span<const value_of<E>> values) noexcept : which_(which), values_(values) {}

 private:
  identity which_;
  std::span<const value_of<E>> values_;
  qsrfhs::aligned_buffer<value_of<E>> copy_;
};

/// A vector that is only read. A null handle and a null block are empty.
template <class E>
class input : public read_only<E> {
 public:
  input(handle<E> array) noexcept : read_only<E>(identity(array), detail::values<E>(array)) {}

  [[nodiscard]] std::int32_t count() const noexcept { return static_cast<std::int32_t>(this->values().size()); }
};

/// A matrix that is only read. A null handle and a null block are empty; negative sizes have no elements.
template <class E>
class input_matrix : public read_only<E> {
 public:
  input_matrix(matrix_handle<E> array) noexcept : read_only<E>(identity(array), detail::values<E>(array)) {
    if (!host::has_block(array)) return;
    rows_ = (*array)->rows;
    columns_ = (*array)->columns;
  }

  [[nodiscard]] matrix_view<const value_of<E>> view() const noexcept {
    return {this->values().data(), rows_, columns_};
  }

 private:
  std::int32_t rows_ = 0, columns_ = 0;
};

/// A vector that the call sizes and writes: a result, a state, or data changed in place. A failure empties it.
template <class E>
class output {
 public:
  explicit output(handle<E> array) noexcept : array_(array) {}

  [[nodiscard]] bool present() const noexcept { return array_ != nullptr; }
  /// The elements there are.
  [[nodiscard]] std::span<value_of<E>> values() const noexcept { return detail::values<E>(array_); }
  [[nodiscard]] identity which() const noexcept { return identity(array_); }

  /// Makes it `count` elements; one that has them is left alone. What they hold is not defined.
  std::span<value_of<E>> resize(std::int64_t count) {
    require(array_ && count <= std::numeric_limits<std::int32_t>::max(), no_memory);
    handle<E> array = array_;
    require(host::resize_vector(&array, static_cast<std::int32_t>(count), static_cast<std::uint64_t>(count)),
            no_memory);
    return values();
  }
  void clear() noexcept { detail::clear_vector(array_); }

 private:
  handle<E> array_;
};

/// A matrix that the call sizes and writes. A failure empties it.
template <class E>
class output_matrix {
 public:
  explicit output_matrix(matrix_handle<E> array) noexcept : array_(array) {}

  [[nodiscard]] identity which() const noexcept { return identity(array_); }
  [[nodiscard]] matrix_view<value_of<E>> view() const noexcept {
    if (!host::has_block(array_)) return {};
    return {reinterpret_cast<value_of<E> *>((*array_)->elements), (*array_)->rows, (*array_)->columns};
  }

  /// Makes it rows times columns elements, none of them negative; a block of that product is left where it is.
  matrix_view<value_of<E>> resize(std::int64_t rows, std::int64_t columns) {
    constexpr std::int64_t most = std::numeric_limits<std::int32_t>::max();
    require(array_ && rows <= most && columns <= most && rows * columns <= most, no_memory);
    require(set_product(rows * columns), no_memory);
    (*array_)->rows = static_cast<std::int32_t>(rows);
    (*array_)->columns = static_cast<std::int32_t>(columns);
    return view();
  }
  void clear() noexcept {
    if (!host::has_block(array_)) return;
    try {
      (void)set_product(0);
    } catch (...) {  // a refusal: the sizes become 0 nevertheless
    }
    if (host::has_block(array_)) (*array_)->rows = (*array_)->columns = 0;
  }

 private:
  bool set_product(std::int64_t count) {
    if (host::has_block(array_) && detail::product(**array_) == count) return true;
    matrix_handle<E> array = array_;
    const auto size = static_cast<std::uint64_t>(count);
    using element = host::element_of<typename E::matrix_block>;
    return host::request_resize(host::type_of<element>, 2, &array, size, size) && host::has_block(array_);
  }

  matrix_handle<E> array_;
};

/// What a failure makes of a scalar result.
enum class failed_result { not_a_number, zero };

/// A scalar result. A null address is allowed.
template <class T, failed_result failed = failed_result::not_a_number>
class result {
 public:
  explicit result(T *address) noexcept : address_(address) {}
  void set(T value) noexcept {
    if (address_) *address_ = value;
  }
  void clear() noexcept { set(failed == failed_result::zero ? T{} : std::numeric_limits<T>::quiet_NaN()); }

 private:
  T *address_;
};

/// Workspace of the caller, empty again whenever the call ends.
template <class E>
class scratch {
 public:
  scratch(handle<E> array) noexcept : array_(array) {}
  scratch(const scratch &) = delete;
  scratch &operator=(const scratch &) = delete;
  ~scratch() { array_.clear(); }

  /// Throws no_scratch for a null handle. `count` elements, undefined.
  std::span<value_of<E>> resize(std::int64_t count) {
    require(present(), no_scratch);
    return array_.resize(count);
  }
  [[nodiscard]] bool present() const noexcept { return array_.present(); }
  [[nodiscard]] identity which() const noexcept { return array_.which(); }

 private:
  output<E> array_;
};

/// Runs an operation on its outputs: its failure, or whatever else it throws, becomes the status, and all outputs are
/// emptied.
template <class Work, class... Outputs>
std::int32_t toolkit_call(Work work, Outputs... outputs) noexcept {
  std::int32_t code = success;
  const qsrfhs::mkl_memory::watch watched;  // BLAS has no status, and LAPACK's may say success or bad arguments
  const qsrfhs::mkl_runtime::use computing;
  try {
    work(outputs...);
  } catch (...) {
    code = status_of_current_exception();
  }
  if (watched.refused()) code = no_memory;
  if (code < 0) (outputs.clear(), ...);
  return code;
}

}  // namespace toolkit
