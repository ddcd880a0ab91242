// SPDX-License-Identifier: MIT
#include <lumra/linear_algebra.h>

#include <algorithm>
#include <cmath>
#include <complex>
#include <cstdint>
#include <limits>
#include <memory>
#include <span>
#include <variant>

#include "open/door.hpp"
#include "open/element.hpp"
#include "open/handle.hpp"
#include "qsrfhs/math/mkl_runtime.hpp"
#include "signal/least_squares.hpp"

namespace doors {
namespace {

struct solver {
  std::variant<dsp::least_squares<float>, dsp::least_squares<double>, dsp::least_squares<std::complex<float>>,
               dsp::least_squares<std::complex<double>>>
      engine;
};

using solvers = handles<lumra_least_squares, solver>;

void require_size(std::uint64_t size, std::string_view name) {
  constexpr std::uint64_t most = std::numeric_limits<std::int32_t>::max();
  require(size >= 1 && size <= most, LUMRA_OUT_OF_RANGE, "options->", name, " is ", size, "; it is 1 to ", most);
}

template <class T>
void require_finite(std::span<const T> values, std::string_view name) {
  const auto bad = std::find_if(values.begin(), values.end(), [](const T &v) {
    return !std::isfinite(std::real(v)) || !std::isfinite(std::imag(v));
  });
  require(bad == values.end(), LUMRA_OUT_OF_RANGE, name, "[", static_cast<std::uint64_t>(bad - values.begin()),
          "] is not finite; leave out what is not a number");
}

template <class T>
void solve(dsp::least_squares<T> &engine, const void *a, const void *b, double rcond, void *x, std::uint64_t *rank) {
  const auto count = [](MKL_INT m, MKL_INT n) { return static_cast<std::uint64_t>(m) * static_cast<std::uint64_t>(n); };
  const auto matrix = array(static_cast<const T *>(a), count(engine.rows(), engine.columns()), "a");
  const auto sides = array(static_cast<const T *>(b), count(engine.rows(), engine.right_sides()), "b");
  const auto solution = array(static_cast<T *>(x), count(engine.columns(), engine.right_sides()), "x");
  require_apart(solution, "x", matrix, "a");
  require_apart(solution, "x", sides, "b");
  using real = typename dsp::least_squares<T>::real;
  const auto cut = std::isnan(rcond) ? static_cast<real>(std::max(engine.rows(), engine.columns())) *
                                           std::numeric_limits<real>::epsilon()
                                     : static_cast<real>(rcond);
  require(cut >= 0, LUMRA_OUT_OF_RANGE, "rcond is ", rcond, "; it is 0 or more, or NaN for the usual");
  require_finite(matrix, "a");
  require_finite(sides, "b");
  const qsrfhs::mkl_runtime::use computing;
  const auto found = engine.solve(matrix, sides, cut, solution);
  require(found.has_value(), LUMRA_NO_CONVERGENCE, "the singular values of a did not converge; scale the problem");
  if (rank) *rank = static_cast<std::uint64_t>(*found);
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_least_squares_create(const lumra_least_squares_options *options, lumra_least_squares **out) {
  return enter(__func__, [&] {
    require_present(out, "out");
    const auto checked = read_options(options, lumra_least_squares_options LUMRA_LEAST_SQUARES_OPTIONS);
    require_type(checked.type);
    require_size(checked.rows, "rows");
    require_size(checked.columns, "columns");
    constexpr std::uint64_t most = std::uint64_t{1} << 40;
    require(checked.rows <= most / checked.columns, LUMRA_OUT_OF_RANGE, "options->rows times columns is more than 2^40",
            "; solve a smaller problem");
    require_size(checked.right_sides, "right_sides");
    const qsrfhs::mkl_runtime::use computing;
    with_type(checked.type, [&](auto element) {
      using T = typename decltype(element)::value;
      solvers::give(out, std::make_unique<solver>(solver{dsp::least_squares<T>(
                             static_cast<MKL_INT>(checked.rows), static_cast<MKL_INT>(checked.columns),
                             static_cast<MKL_INT>(checked.right_sides))}));
    });
  });
}

void lumra_least_squares_free(lumra_least_squares *solver) {
  solvers::free(solver);
}

lumra_status lumra_least_squares_solve(lumra_least_squares *solver, const void *a, const void *b, double rcond, void *x,
                                       uint64_t *rank) {
  return enter(__func__, [&] {
    std::visit([&](auto &engine) { solve(engine, a, b, rcond, x, rank); }, solvers::get(solver, "solver").engine);
  });
}
