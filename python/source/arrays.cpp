// SPDX-License-Identifier: MIT
#include "arrays.hpp"

#include <cstring>
#include <utility>

namespace binding {
namespace {

using api = py::detail::npy_api;

/// A C array of the type: aligned and in the machine's byte order, however far apart.
template <class T>
using usable = py::array_t<T, int{py::array::forcecast} | int{api::NPY_ARRAY_ALIGNED_}>;

py::array array_of(py::handle object, const char *name) {
  if (py::isinstance<py::array>(object)) return py::reinterpret_borrow<py::array>(object);
  try {
    return py::array(py::reinterpret_borrow<py::object>(object));
  } catch (py::error_already_set &failed) {
    if (!failed.matches(PyExc_ValueError) && !failed.matches(PyExc_TypeError)) throw;
    refuse_value(name, text_of(object), "give an array of numbers");
  }
}

bool is_usable(const py::array &array, element type) {
  const auto *descriptor = py::detail::array_descriptor_proxy(array.dtype().ptr());
  const int number = type == element::f32    ? api::NPY_FLOAT_
                     : type == element::f64  ? api::NPY_DOUBLE_
                     : type == element::cf32 ? api::NPY_CFLOAT_
                                             : api::NPY_CDOUBLE_;
  return descriptor->type_num == number && (descriptor->byteorder == '=' || descriptor->byteorder == '|') &&
         (array.flags() & api::NPY_ARRAY_ALIGNED_) != 0;
}

/// The bytes from the lowest to the highest that belong to an array.
std::pair<const char *, const char *> extent_of(const py::array &array) {
  const char *low = static_cast<const char *>(array.data()), *high = low;
  if (array.size() == 0) return {low, low};
  for (py::ssize_t i = 0; i < array.ndim(); ++i) {
    const py::ssize_t reach = (array.shape(i) - 1) * array.strides(i);
    (reach < 0 ? low : high) += reach;
  }
  return {low, high + array.itemsize()};
}

/// Whether writing to one array may change the other.
bool may_overlap(const py::array &a, const py::array &b) {
  const auto [a_low, a_high] = extent_of(a);
  const auto [b_low, b_high] = extent_of(b);
  return a_low < b_high && b_low < a_high;
}

/// Whether both are one array, without gaps and of one type.
bool is_same(const py::array &a, const py::array &b) {
  return a.data() == b.data() && a.nbytes() == b.nbytes() && a.itemsize() == b.itemsize() &&
         (b.flags() & py::array::c_style) != 0;
}

std::string text_of_shape(const std::vector<py::ssize_t> &shape) {
  std::string text = "(";
  for (const py::ssize_t length : shape) text += std::to_string(length) + (shape.size() == 1 ? "," : ", ");
  if (shape.size() > 1) text.resize(text.size() - 2);
  return text + ")";
}
std::string text_of_shape(const py::array &array) {
  return text_of_shape(std::vector<py::ssize_t>(array.shape(), array.shape() + array.ndim()));
}

}  // namespace

py::dtype dtype_of(element type) {
  return with_type(type, []<class T>(std::type_identity<T>) { return py::dtype::of<T>(); });
}

const char *name_of(element type) noexcept {
  switch (type) {
    case element::f32:
      return "float32";
    case element::f64:
      return "float64";
    case element::cf32:
      return "complex64";
    default:
      return "complex128";
  }
}

numbers::numbers(py::handle object, const char *called) : array(array_of(object, called)), name(called) {
  const auto *descriptor = py::detail::array_descriptor_proxy(array.dtype().ptr());
  switch (descriptor->kind) {
    case 'f':
      type = of(false, array.itemsize() <= 4);
      break;
    case 'c':
      type = of(true, array.itemsize() <= 8);
      break;
    case 'b':
    case 'i':
    case 'u':
      type = element::f64;
      break;
    default:
      refuse_type(name, "of dtype " + std::string(py::str(array.dtype())), "give real or complex numbers");
  }
}

py::array numbers::as(element wanted) const {
  if (is_usable(array, wanted)) return array;
  return with_type(wanted, [&]<class T>(std::type_identity<T>) -> py::array { return usable<T>(array); });
}

samples::samples(const numbers &of, element wanted) : array_(of.as(wanted)), type_(wanted) {
  if (array_.ndim() != 1) {
    refuse_value(of.name, "of shape " + text_of_shape(of.array), "give an array of one dimension");
  }
  look();
  if (array_.strides(0) % bytes_of(type_) != 0) gather();
}

void samples::look() {
  data_ = array_.data();
  size_ = static_cast<std::size_t>(array_.shape(0));
  // NumPy leaves any stride to arrays of fewer than two elements.
  step_ = size_ < 2 ? 1 : array_.strides(0) / bytes_of(type_);
}

void samples::gather() {
  if (step_ == 1 && (size_ < 2 || array_.strides(0) == bytes_of(type_))) return;
  copy();
}

void samples::copy() {
  array_ = array_.attr("copy")().cast<py::array>();
  look();
}

py::array new_array(element type, const std::vector<py::ssize_t> &shape) {
  return py::array(dtype_of(type), shape);
}

py::array new_array(element type, std::size_t size) {
  return py::array(dtype_of(type), static_cast<py::ssize_t>(size));
}

target::target(py::handle out, element type, const std::vector<py::ssize_t> &shape,
               std::initializer_list<const py::array *> inputs) {
  if (out.is_none()) {
    given_ = written_ = new_array(type, shape);
  } else {
    if (!py::isinstance<py::array>(out)) refuse_type("out", text_of(out), "give an array or None");
    given_ = written_ = py::reinterpret_borrow<py::array>(out);
    if (!is_usable(given_, type))
      refuse_type("out", "of dtype " + std::string(py::str(given_.dtype())),
                  std::string("give one of ") + name_of(type));
    if (!std::equal(shape.begin(), shape.end(), given_.shape(), given_.shape() + given_.ndim()))
      refuse_value("out", "of shape " + text_of_shape(given_), "give one of shape " + text_of_shape(shape));
    if (!given_.writeable()) refuse_value("out", "read-only", "give an array that can be written");
    bool apart = (given_.flags() & py::array::c_style) == 0;
    for (const py::array *input : inputs) apart = apart || (may_overlap(given_, *input) && !is_same(given_, *input));
    if (apart) written_ = new_array(type, shape);
  }
  data_ = written_.mutable_data();
}

py::array target::finish() {
  if (!given_.is(written_)) given_[py::ellipsis()] = written_;
  return std::move(given_);
}

}  // namespace binding
