// SPDX-License-Identifier: MIT
#include <cmath>
#include <limits>
#include <lumra/linear_algebra.hpp>

#include "arrays.hpp"
#include "module.hpp"
#include "patience.hpp"

namespace binding {
namespace {

struct solver_release {
  void operator()(lumra_least_squares *solver) const noexcept { lumra_least_squares_free(solver); }
};

/// Row by row without gaps.
py::array rows_of(const numbers &of, element type) {
  const py::array array = of.as(type);
  return (array.flags() & py::array::c_style) != 0 ? array : array.attr("copy")("C").cast<py::array>();
}

py::array solve(py::handle a_given, py::handle b_given, py::handle rcond_given) {
  const numbers a(a_given, "a"), b(b_given, "b");
  const auto shape_text = [](const numbers &of) { return "of shape " + std::string(py::str(of.array.attr("shape"))); };
  if (a.array.ndim() != 2 || a.array.size() == 0)
    refuse_value("a", shape_text(a), "give a matrix of one row and column or more");
  if ((b.array.ndim() != 1 && b.array.ndim() != 2) || b.array.shape(0) != a.array.shape(0) || b.array.size() == 0)
    refuse_value("b", shape_text(b),
                 "give a vector or matrix of as many rows as a has, " + std::to_string(a.array.shape(0)));
  double rcond = std::numeric_limits<double>::quiet_NaN();
  if (!rcond_given.is_none()) {
    rcond = number(rcond_given, "rcond");
    if (!(rcond >= 0 && std::isfinite(rcond))) refuse_value("rcond", text_of(rcond_given), "give 0 or more, or None");
  }
  const element type = of(is_complex(a.type) || is_complex(b.type), is_single(a.type) && is_single(b.type));
  const py::array left = rows_of(a, type), right = rows_of(b, type);
  lumra_least_squares_options how = LUMRA_LEAST_SQUARES_OPTIONS;
  how.type = static_cast<std::int32_t>(type);
  how.rows = static_cast<std::uint64_t>(a.array.shape(0));
  how.columns = static_cast<std::uint64_t>(a.array.shape(1));
  how.right_sides = b.array.ndim() == 2 ? static_cast<std::uint64_t>(b.array.shape(1)) : 1;
  std::vector<py::ssize_t> shape(b.array.shape(), b.array.shape() + b.array.ndim());
  shape[0] = a.array.shape(1);
  py::array x = new_array(type, shape);
  void *const to = x.mutable_data();
  const void *const from_a = left.data(), *const from_b = right.data();
  const double rows = static_cast<double>(how.rows), columns = static_cast<double>(how.columns);
  const double expected = 2e-9 * rows * columns * (std::min(rows, columns) + static_cast<double>(how.right_sides));
  run_patiently(expected, {left, right, x}, [=] {
    lumra_least_squares *made = nullptr;
    lumra::check_open(lumra_least_squares_create(&how, &made));
    const std::unique_ptr<lumra_least_squares, solver_release> solver(made);
    lumra::check_open(lumra_least_squares_solve(made, from_a, from_b, rcond, to, nullptr));
  });
  return x;
}

}  // namespace

void add_least_squares(py::module_ &module) {
  module.def("lstsq", &solve);
}

}  // namespace binding
