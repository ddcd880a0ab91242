// SPDX-License-Identifier: MIT
#include "windows.hpp"

#include "arrays.hpp"
#include "module.hpp"
#include "patience.hpp"

namespace binding {
namespace {

constexpr const char *known = "hann, flattop, blackmanharris and (\"kaiser\", 8.6) are some";
/// A value takes about so long.
constexpr double seconds_each = 2e-8;
/// More than fits in any machine's memory as doubles.
constexpr std::int64_t most = std::int64_t{1} << 40;

std::uint64_t length_of(py::handle n, std::int64_t least) {
  const std::int64_t length = whole_number(n, "n", least);
  if (length > most) refuse_value("n", text_of(n), "give at most 2^40");
  return static_cast<std::uint64_t>(length);
}

py::array make(py::handle name, py::handle n, bool symmetric, py::handle dtype) {
  const lumra::window_shape shape = window_of(name);
  const std::uint64_t length = length_of(n, 0);
  py::dtype wanted = py::dtype::of<double>();
  try {
    wanted = py::dtype::from_args(py::reinterpret_borrow<py::object>(dtype));
  } catch (py::error_already_set &) {
    refuse_type("dtype", text_of(dtype), "give numpy.float32 or numpy.float64");
  }
  if (wanted.kind() != 'f' || (wanted.itemsize() != 4 && wanted.itemsize() != 8))
    refuse_type("dtype", text_of(dtype), "give numpy.float32 or numpy.float64");
  const auto span = symmetric ? lumra::window_span::symmetric : lumra::window_span::periodic;
  py::array values = new_array(of(false, wanted.itemsize() == 4), length);
  void *const to = values.mutable_data();
  const bool single = wanted.itemsize() == 4;
  run_patiently(seconds_each * static_cast<double>(length), {values}, [=] {
    if (single)
      lumra::make_window(shape, std::span(static_cast<float *>(to), length), span);
    else
      lumra::make_window(shape, std::span(static_cast<double *>(to), length), span);
  });
  return values;
}

py::tuple figures(py::handle name, py::handle n) {
  const lumra::window_shape shape = window_of(name);
  const std::uint64_t length = length_of(n, 1);
  const auto found = std::make_shared<lumra_window_quality>();
  run_patiently(seconds_each * static_cast<double>(length), {}, [=] { *found = lumra::window_figures(shape, length); });
  return py::make_tuple(found->coherent_gain, found->noise_bandwidth_bins, found->scalloping_loss_db);
}

}  // namespace

lumra::window_shape window_of(py::handle name) {
  if (py::isinstance<py::str>(name)) {
    lumra::window_shape shape;
    std::string text;
    try {
      text = name.cast<std::string>();
    } catch (py::cast_error &) {  // a surrogate alone
      text = "\xff";
    }
    const bool found = text.find('\0') == std::string::npos &&
                       lumra_window_by_name(text.c_str(), &shape.type, &shape.parameter) == LUMRA_SUCCESS;
    if (!found) refuse_value("window", text_of(name), known);
    if (text == "kaiser") refuse_value("window", text_of(name), "give its beta, too: (\"kaiser\", 8.6)");
    return shape;
  }
  if (!py::isinstance<py::tuple>(name) && !py::isinstance<py::list>(name))
    refuse_type("window", text_of(name), "give a name, or (\"kaiser\", beta)");
  const auto parts = py::reinterpret_borrow<py::sequence>(name);
  if (parts.size() == 1) return window_of(py::object(parts[0]));
  if (parts.size() != 2 || !py::isinstance<py::str>(py::object(parts[0])) ||
      !py::object(parts[0]).equal(py::str("kaiser")))
    refuse_value("window", text_of(name), "give a name, or (\"kaiser\", beta)");
  const double beta = number(py::object(parts[1]), "the window's beta");
  if (!(beta >= 0 && beta <= 700)) refuse_value("window", text_of(name), "Kaiser's beta is 0 to 700");
  return lumra::window_shape(LUMRA_WINDOW_KAISER, beta);
}

void add_windows(py::module_ &module) {
  module.def("window", &make);
  module.def("window_figures", &figures);
}

}  // namespace binding
