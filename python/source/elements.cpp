// Element by element. SPDX-License-Identifier: MIT
#include <lumra/elementwise.hpp>

#include "arrays.hpp"
#include "module.hpp"

namespace binding {
namespace {

/// Samples of one call without the GIL in between: a fraction of a millisecond.
constexpr std::size_t piece = std::size_t{1} << 20;

std::vector<py::ssize_t> shape_of(const samples &x) {
  return {static_cast<py::ssize_t>(x.size())};
}

/// out[i] of x[i], by run(x, out, count).
template <class In, class Out, class Run>
void each(const samples &x, Out *out, Run run) {
  const py::gil_scoped_release released;
  in_pieces<In>(x, piece, [&](const In *from, std::size_t count) {
    run(std::span<const In>(from, count), std::span<Out>(out, count));
    out += count;
  });
}

/// Of x to real numbers.
template <class Run>
py::array to_real(py::handle of, py::handle out, Run run) {
  const samples x(of, "x");
  target result(out, real_of(x.type()), shape_of(x), {&x.array()});
  with_type(x.type(), [&]<class T>(std::type_identity<T>) {
    each<T>(x, result.first<lumra::real_type<T>>(),
            [&](std::span<const T> from, std::span<lumra::real_type<T>> to) { run.template operator()<T>(from, to); });
  });
  return result.finish();
}

py::array magnitude(py::handle x, py::handle out) {
  return to_real(x, out, []<class T>(auto from, auto to) { lumra::magnitude<T>(from, to); });
}
py::array power(py::handle x, py::handle out) {
  return to_real(x, out, []<class T>(auto from, auto to) { lumra::power<T>(from, to); });
}
py::array decibels(py::handle x, py::handle out) {
  return to_real(x, out, []<class T>(auto from, auto to) { lumra::decibels<T>(from, to); });
}

py::array quotients(const samples &x, samples &y, py::handle out) {
  if (y.size() != x.size())
    refuse_value("y", "of " + std::to_string(y.size()) + " elements",
                 "give as many as x has, " + std::to_string(x.size()) + ", or one number");
  y.gather();
  target result(out, x.type(), shape_of(x), {&x.array(), &y.array()});
  with_type(x.type(), [&]<class T>(std::type_identity<T>) {
    const T *divisor = y.first<T>();
    each<T>(x, result.first<T>(), [&](std::span<const T> from, std::span<T> to) {
      lumra::divide<T>(from, {divisor, from.size()}, to);
      divisor += from.size();
    });
  });
  return result.finish();
}

template <class T>
auto value_function() {
  return lumra::detail::form<T>(&lumra_divide_by_value_f32, &lumra_divide_by_value_f64, &lumra_divide_by_value_cf32,
                                &lumra_divide_by_value_cf64);
}

/// One number has the precision of x.
py::array divide(py::handle of, py::handle by, py::handle out) {
  const numbers dividend(of, "x"), divisor(by, "y");
  const bool complex = is_complex(dividend.type) || is_complex(divisor.type);
  if (divisor.array.ndim() != 0) {
    const element type = binding::of(complex, is_single(dividend.type) && is_single(divisor.type));
    samples y(divisor, type);
    return quotients(samples(dividend, type), y, out);
  }
  const samples x(dividend, binding::of(complex, is_single(dividend.type)));
  const py::array value = divisor.as(x.type());
  target result(out, x.type(), shape_of(x), {&x.array()});
  with_type(x.type(), [&]<class T>(std::type_identity<T>) {
    const T one = *static_cast<const T *>(value.data());
    each<T>(x, result.first<T>(), [&](std::span<const T> from, std::span<T> to) {
      const auto *in = lumra::detail::raw(from.data());
      auto *quotient = lumra::detail::raw(to.data());
      if constexpr (std::is_floating_point_v<T>)
        lumra::check_open(value_function<T>()(in, one, quotient, from.size()));
      else
        lumra::check_open(value_function<T>()(in, {one.real(), one.imag()}, quotient, from.size()));
    });
  });
  return result.finish();
}

/// Coefficients have the precision of x.
py::array polynomial(py::handle of, py::handle coefficients, py::handle out) {
  const samples x(of, "x");
  const numbers given(coefficients, "c");
  samples c(given, binding::of(is_complex(x.type()) || is_complex(given.type), is_single(x.type())));
  if (c.size() == 0) refuse_value("c", "empty", "give one coefficient or more");
  c.gather();
  target result(out, c.type(), shape_of(x), {&x.array(), &c.array()});
  with_type(x.type(), [&]<class T>(std::type_identity<T>) {
    if (is_complex(c.type()) == is_complex(x.type())) {
      each<T>(x, result.first<T>(), [&](std::span<const T> from, std::span<T> to) {
        lumra::polynomial<T>(from, {c.first<T>(), c.size()}, to);
      });
    } else if constexpr (std::is_floating_point_v<T>) {
      using C = std::complex<T>;
      constexpr auto run = lumra::detail::form<C>(0, 0, &lumra_polynomial_of_real_cf32, &lumra_polynomial_of_real_cf64);
      each<T>(x, result.first<C>(), [&](std::span<const T> from, std::span<C> to) {
        lumra::check_open(
            run(from.data(), lumra::detail::raw(c.first<C>()), c.size(), lumra::detail::raw(to.data()), from.size()));
      });
    }
  });
  return result.finish();
}

/// Real gains of real samples give real samples. Keys and gains have the precision of x.
py::array lookup(py::handle keys_given, py::handle of, py::handle table_given, py::handle start_given,
                 py::handle step_given, py::handle out) {
  const numbers samples_given(of, "x"), gains(table_given, "table"), at(keys_given, "keys");
  if (is_complex(at.type)) refuse_type("keys", std::string("of dtype ") + name_of(at.type), "give real numbers");
  const element type = complex_of(samples_given.type);
  const bool real = !is_complex(samples_given.type) && !is_complex(gains.type);
  const samples x(samples_given, type);
  samples table(gains, type), keys(at, real_of(type));
  if (keys.size() != x.size())
    refuse_value("keys", "of " + std::to_string(keys.size()) + " elements",
                 "give as many as x has, " + std::to_string(x.size()));
  if (table.size() == 0) refuse_value("table", "empty", "give one gain or more");
  table.gather();
  keys.gather();
  const double start = number(start_given, "start"), step = number(step_given, "step");
  const auto run_over = [&]<class T>(std::type_identity<T>, T *result) {
    using real_value = lumra::real_type<T>;
    const real_value *key = keys.first<real_value>();
    each<T>(x, result, [&](std::span<const T> from, std::span<T> to) {
      if constexpr (!std::is_floating_point_v<T>)
        lumra::lookup<T>(from, {key, from.size()}, {table.first<T>(), table.size()}, static_cast<real_value>(start),
                         static_cast<real_value>(step), to);
      key += from.size();
    });
  };
  if (real) {
    const py::array wide = new_array(type, x.size());
    with_type(type, [&]<class T>(std::type_identity<T> t) {
      run_over(t, static_cast<T *>(const_cast<void *>(wide.data())));
    });
    target result(out, real_of(type), shape_of(x), {&x.array()});
    py::array given = result.finish();
    given[py::ellipsis()] = wide.attr("real");
    return given;
  }
  target result(out, type, shape_of(x), {&x.array(), &table.array(), &keys.array()});
  with_type(type, [&]<class T>(std::type_identity<T> t) { run_over(t, result.first<T>()); });
  return result.finish();
}

/// The function with one argument more: how many threads it may use.
template <class... Arguments>
auto by_threads(py::array (*function)(Arguments...)) {
  return [function](Arguments... arguments, py::handle threads) {
    const lumra::elementwise_threads use(number_of_threads(threads));
    return function(arguments...);
  };
}

}  // namespace

void add_elements(py::module_ &module) {
  module.def("magnitude", by_threads(&magnitude));
  module.def("power", by_threads(&power));
  module.def("decibels", by_threads(&decibels));
  module.def("divide", by_threads(&divide));
  module.def("polynomial", by_threads(&polynomial));
  module.def("lookup", by_threads(&lookup));
}

}  // namespace binding
