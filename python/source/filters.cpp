// Recursive filters along an axis, convolution and correlation, designs. SPDX-License-Identifier: MIT
#include <cstring>
#include <lumra/filter.hpp>

#include "arrays.hpp"
#include "axis.hpp"
#include "coefficients.hpp"
#include "module.hpp"
#include "patience.hpp"
#include "recent.hpp"
#include "stream_filters.hpp"

namespace binding {
namespace {

struct recursion_key {
  element type;
  std::vector<double> b, a;  // with sections b alone

  bool operator==(const recursion_key &other) const noexcept = default;
};

using recursion = lumra::detail::owned<lumra_iir, &lumra_iir_free>;

recursion make_recursion(const recursion_key &of) {
  lumra_iir_options how = LUMRA_IIR_OPTIONS;
  how.type = static_cast<std::int32_t>(of.type);
  return lumra::detail::make<recursion>([&](lumra_iir **out) {
    return of.a.empty() ? lumra_iir_create_sections(&how, of.b.data(), of.b.size() / 6, out)
                        : lumra_iir_create(&how, of.b.data(), of.b.size(), of.a.data(), of.a.size(), out);
  });
}

template <class T>
void filter_row(lumra_iir *filter, const T *in, std::ptrdiff_t in_step, T *out, std::ptrdiff_t out_step,
                std::size_t count, std::size_t piece, interruptions &signals) {
  const bool in_place = in_step == 1 && out_step == 1;
  const std::size_t at_once = in_place ? piece : std::min({gathered, piece, count});
  std::vector<T> buffer(in_place ? 0 : at_once);
  for (std::size_t done = 0; done < count;) {
    const std::size_t part = std::min(at_once, count - done);
    const auto at = static_cast<std::ptrdiff_t>(done);
    if (in_place) {
      lumra::check_open(lumra_iir_process(filter, in + at, out + at, part));
    } else {
      gather(in + at * in_step, in_step, buffer.data(), part);
      lumra::check_open(lumra_iir_process(filter, buffer.data(), buffer.data(), part));
      for (std::size_t i = 0; i < part; ++i) out[(at + static_cast<std::ptrdiff_t>(i)) * out_step] = buffer[i];
    }
    done += part;
    if (done < count) signals.poll();
  }
}

/// Rows by one filter, each from its own state: `states` holds one after the other, or is null for rest; they are
/// replaced by those behind the rows.
template <class T>
void filter_rows(const recursion_key &key, const py::array &x, py::array &y, std::size_t axis, char *states) {
  thread_local recent<recursion_key, recursion> kept(8);
  const axis_rows rows(x, y, axis, true);
  const auto *const from = static_cast<const T *>(x.data());
  auto *const to = static_cast<T *>(y.mutable_data());
  const auto count = static_cast<std::size_t>(x.shape(static_cast<py::ssize_t>(axis)));
  const py::gil_scoped_release released;
  interruptions signals;
  recursion filter = kept.take(key, [&] { return make_recursion(key); });
  const std::size_t piece = filtered_at_once(key.a.size() + key.b.size());
  const std::size_t order = lumra::detail::number_of(filter.get(), &lumra_iir_order);
  const std::size_t state_bytes = order * (is_complex(key.type) ? 16 : 8);
  rows.each([&](std::ptrdiff_t in, std::ptrdiff_t out) {
    if (states != nullptr)
      lumra::check_open(lumra_iir_set_state(filter.get(), states, order));
    else
      lumra::check_open(lumra_iir_reset(filter.get()));
    filter_row(filter.get(), from + in, rows.in_step, to + out, rows.out_step, count, piece, signals);
    if (states == nullptr) return;
    lumra::check_open(lumra_iir_get_state(filter.get(), states, order));
    states += state_bytes;
    signals.poll();
  });
  kept.keep(key, std::move(filter));
}

/// The states that were given for all rows, one row's behind the other: zi with the axes of the state moved to the end.
/// Throws ValueError.
py::array states_of(const numbers &zi, element type, const std::vector<py::ssize_t> &shape,
                    const py::tuple &state_axes) {
  const py::module_ numpy = py::module_::import("numpy");
  bool fits = zi.array.ndim() == static_cast<py::ssize_t>(shape.size());
  for (std::size_t i = 0; fits && i < shape.size(); ++i)
    fits = zi.array.shape(static_cast<py::ssize_t>(i)) == shape[i] || zi.array.shape(static_cast<py::ssize_t>(i)) == 1;
  if (!fits)
    refuse_value("zi", "of shape " + std::string(py::str(zi.array.attr("shape"))),
                 "give one of shape " + std::string(py::str(shape_tuple(shape))));
  const py::object all = numpy.attr("broadcast_to")(zi.as(type), shape_tuple(shape));
  py::tuple last(state_axes.size());
  for (std::size_t i = 0; i < last.size(); ++i)
    last[i] = static_cast<py::ssize_t>(i) - static_cast<py::ssize_t>(last.size());
  return numpy.attr("moveaxis")(all, state_axes, last).attr("copy")("C").cast<py::array>();
}

/// y, or (y, zf) where there is zi. `state_shape` gives the shape of zi and the axes of it that one row's state has.
template <class StateShape>
py::object filter_along(recursion_key key, py::handle of, py::handle axis_given, py::handle zi_given,
                        StateShape state_shape) {
  const numbers given(of, "x");
  const std::size_t axis = axis_of(given, axis_given);
  key.type = given.type;
  py::array states;
  py::tuple state_axes;
  if (!zi_given.is_none()) {
    const numbers zi(zi_given, "zi");
    if (is_complex(zi.type)) key.type = complex_of(key.type);
    std::vector<py::ssize_t> shape(given.array.shape(), given.array.shape() + given.array.ndim());
    state_axes = state_shape(shape, static_cast<py::ssize_t>(axis));
    states = states_of(zi, binding::of(is_complex(key.type), false), shape, state_axes);
  }
  py::array x = given.as(key.type);
  if (!has_whole_strides(x)) x = x.attr("copy")().cast<py::array>();
  py::array y = new_array(key.type, std::vector<py::ssize_t>(x.shape(), x.shape() + x.ndim()));
  char *const first_state = zi_given.is_none() ? nullptr : static_cast<char *>(states.mutable_data());
  with_type(key.type, [&]<class T>(std::type_identity<T>) { filter_rows<T>(key, x, y, axis, first_state); });
  if (zi_given.is_none()) return y;
  py::tuple last(state_axes.size());
  for (std::size_t i = 0; i < last.size(); ++i)
    last[i] = static_cast<py::ssize_t>(i) - static_cast<py::ssize_t>(last.size());
  return py::make_tuple(y, py::module_::import("numpy").attr("moveaxis")(states, last, state_axes));
}

py::object lfilter(py::handle b, py::handle a, py::handle x, py::handle axis, py::handle zi) {
  recursion_key key{element::f64, real_coefficients(b, "b"), real_coefficients(a, "a")};
  const auto order = static_cast<py::ssize_t>(std::max(key.b.size(), key.a.size()) - 1);
  return filter_along(std::move(key), x, axis, zi, [&](std::vector<py::ssize_t> &shape, py::ssize_t along) {
    shape[static_cast<std::size_t>(along)] = order;
    return py::make_tuple(along);
  });
}

py::object sosfilter(py::handle sos_given, py::handle x, py::handle axis, py::handle zi) {
  recursion_key key{element::f64, sections(sos_given), {}};
  const auto count = static_cast<py::ssize_t>(key.b.size() / 6);
  return filter_along(std::move(key), x, axis, zi, [&](std::vector<py::ssize_t> &shape, py::ssize_t along) {
    shape[static_cast<std::size_t>(along)] = 2;
    shape.insert(shape.begin(), count);
    return py::make_tuple(0, along + 1);
  });
}

lumra::mode mode_of(py::handle mode) {
  if (py::isinstance<py::str>(mode)) {
    if (mode.equal(py::str("full"))) return lumra::mode::full;
    if (mode.equal(py::str("same"))) return lumra::mode::same;
    if (mode.equal(py::str("valid"))) return lumra::mode::valid;
  }
  refuse_value("mode", text_of(mode), "give \"full\", \"same\" or \"valid\"");
}

/// By run(x, nx, y, ny, mode, method, out, room) over elements as the library takes them.
template <class T, class Tap, class Run>
py::array combine(Run run, const samples &x, const samples &y, lumra::mode mode) {
  const auto part = static_cast<std::int32_t>(mode);
  std::uint64_t count = 0;
  lumra::check_open(lumra_convolve_size(x.size(), y.size(), part, &count));
  py::array result = new_array(x.type(), count);
  auto *const out = lumra::detail::raw(static_cast<T *>(result.mutable_data()));
  const auto *const in = lumra::detail::raw(x.first<T>());
  const auto *const other = lumra::detail::raw(y.first<Tap>());
  const std::size_t nx = x.size(), ny = y.size();
  // A nanosecond for each product, or 100 for each sample through transforms.
  const double expected = 1e-9 * static_cast<double>(nx + ny) * std::min(100.0, static_cast<double>(std::min(nx, ny)));
  run_patiently(expected, {x.array(), y.array(), result},
                [=] { lumra::check_open(run(in, nx, other, ny, part, LUMRA_METHOD_AUTO, out, count)); });
  return result;
}

samples record_of(const numbers &of, element type) {
  samples x(of, type);
  if (x.size() == 0) refuse_value(of.name, "empty", "give one sample or more");
  x.gather();
  return x;
}

/// The result has the precision of x.
py::array convolve(py::handle x_given, py::handle h_given, py::handle mode_given) {
  const lumra::mode mode = mode_of(mode_given);
  const numbers x(x_given, "x"), h(h_given, "h");
  const element type = of(is_complex(x.type) || is_complex(h.type), is_single(x.type));
  const samples left = record_of(x, type), right = record_of(h, of(is_complex(h.type), is_single(x.type)));
  return with_type(type, [&]<class T>(std::type_identity<T>) {
    if constexpr (!std::is_floating_point_v<T>)
      if (!is_complex(h.type))
        return combine<T, lumra::real_type<T>>(
            lumra::detail::form<T>(0, 0, &lumra_convolve_with_real_cf32, &lumra_convolve_with_real_cf64), left, right,
            mode);
    return combine<T, T>(
        lumra::detail::form<T>(&lumra_convolve_f32, &lumra_convolve_f64, &lumra_convolve_cf32, &lumra_convolve_cf64),
        left, right, mode);
  });
}

py::array correlate(py::handle x_given, py::handle y_given, py::handle mode_given) {
  const lumra::mode mode = mode_of(mode_given);
  const numbers x(x_given, "x"), y(y_given, "y");
  const element type = of(is_complex(x.type) || is_complex(y.type), is_single(x.type));
  const samples left = record_of(x, type), right = record_of(y, type);
  return with_type(type, [&]<class T>(std::type_identity<T>) {
    return combine<T, T>(lumra::detail::form<T>(&lumra_correlate_f32, &lumra_correlate_f64, &lumra_correlate_cf32,
                                                &lumra_correlate_cf64),
                         left, right, mode);
  });
}

py::array taps_of(const std::vector<double> &taps) {
  py::array array = new_array(element::f64, taps.size());
  std::memcpy(array.mutable_data(), taps.data(), taps.size() * sizeof(double));
  return array;
}

py::array kaiser_lowpass(py::handle rate, py::handle pass, py::handle stop, py::handle rejection) {
  return taps_of(lumra::kaiser_lowpass(number(rate, "sample_rate"), number(pass, "pass_edge"),
                                       number(stop, "stop_edge"), number(rejection, "rejection")));
}

py::array root_raised_cosine(py::handle rate, py::handle symbol_rate, py::handle roll_off, py::handle span) {
  return taps_of(lumra::root_raised_cosine(number(rate, "sample_rate"), number(symbol_rate, "symbol_rate"),
                                           number(roll_off, "roll_off"), number(span, "span")));
}

}  // namespace

void add_filters(py::module_ &module) {
  module.def("lfilter", &lfilter);
  module.def("sosfilter", &sosfilter);
  module.def("convolve", &convolve);
  module.def("correlate", &correlate);
  module.def("kaiser_lowpass", &kaiser_lowpass);
  module.def("root_raised_cosine", &root_raised_cosine);
  add_stream_filters(module);
}

}  // namespace binding
