// SPDX-License-Identifier: MIT
#include "axis.hpp"

namespace binding {

std::size_t axis_of(const numbers &x, py::handle axis) {
  const py::ssize_t dimensions = x.array.ndim();
  if (dimensions == 0) refuse_value(x.name, text_of(x.array), "give an array of one dimension or more");
  const std::int64_t given = whole_number(axis, "axis", -(std::int64_t{1} << 31));
  if (given < -dimensions || given >= dimensions)
    refuse_value("axis", text_of(axis),
                 std::string(x.name) + " has " + std::to_string(dimensions) + " dimension(s), counted from 0");
  return static_cast<std::size_t>(given < 0 ? given + dimensions : given);
}

bool has_whole_strides(const py::array &array) {
  for (py::ssize_t i = 0; i < array.ndim(); ++i)
    if (array.shape(i) > 1 && array.strides(i) % array.itemsize() != 0) return false;
  return true;
}

py::tuple shape_tuple(const std::vector<py::ssize_t> &shape) {
  py::tuple lengths(shape.size());
  for (std::size_t i = 0; i < shape.size(); ++i) lengths[i] = shape[i];
  return lengths;
}

axis_rows::axis_rows(const py::array &in, const py::array &out, std::size_t axis, bool single)
    : in_step(in.strides(static_cast<py::ssize_t>(axis)) / in.itemsize()),
      out_step(out.strides(static_cast<py::ssize_t>(axis)) / out.itemsize()),
      empty_(in.size() == 0 || out.size() == 0) {
  for (py::ssize_t i = 0; i < in.ndim(); ++i) {
    if (i == static_cast<py::ssize_t>(axis) || in.shape(i) == 1) continue;
    const dimension now{in.shape(i), in.strides(i) / in.itemsize(), out.strides(i) / out.itemsize()};
    // Two dimensions that lie in both arrays as one would are one.
    if (!outer_.empty() && outer_.back().in == now.in * now.length && outer_.back().out == now.out * now.length)
      outer_.back() = {outer_.back().length * now.length, now.in, now.out};
    else
      outer_.push_back(now);
  }
  if (outer_.empty() || single) return;
  const auto longest = std::max_element(outer_.begin(), outer_.end(),
                                        [](const dimension &a, const dimension &b) { return a.length < b.length; });
  rows = static_cast<std::uint64_t>(longest->length);
  in_distance = longest->in;
  out_distance = longest->out;
  outer_.erase(longest);
}

}  // namespace binding
