// SPDX-License-Identifier: MIT
#include "coefficients.hpp"

namespace binding {
namespace {

numbers real_numbers(py::handle given, const char *name) {
  numbers found(given, name);
  if (is_complex(found.type)) refuse_type(name, std::string("of dtype ") + name_of(found.type), "give real numbers");
  return found;
}

}  // namespace

std::vector<double> real_coefficients(py::handle given, const char *name) {
  numbers found = real_numbers(given, name);
  if (found.array.ndim() == 0) found.array = found.array.reshape({1});
  const samples values(found, element::f64);
  if (values.size() == 0) refuse_value(name, "empty", "give one coefficient or more");
  std::vector<double> result(values.size());
  gather(values.first<double>(), values.step(), result.data(), result.size());
  return result;
}

std::vector<double> sections(py::handle given) {
  const numbers found = real_numbers(given, "sos");
  if (found.array.ndim() != 2 || found.array.shape(0) == 0 || found.array.shape(1) != 6)
    refuse_value("sos", "of shape " + std::string(py::str(found.array.attr("shape"))),
                 "give one row or more of six coefficients");
  const py::array rows = found.as(element::f64).attr("copy")("C").cast<py::array>();
  const auto *const first = static_cast<const double *>(rows.data());
  return {first, first + rows.size()};
}

}  // namespace binding
