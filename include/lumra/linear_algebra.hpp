// Least squares over spans. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/linear_algebra.h>
#include <lumra/object.hpp>

#include <cstddef>
#include <cstdint>
#include <limits>
#include <span>
#include <vector>

namespace lumra {

template <sample T>
struct least_squares_solution {
  std::vector<T> x;  // columns times right sides, row by row
  std::size_t rank = 0;
};

/// Solves problems of one size; see linear_algebra.h. One thread at a time.
template <sample T>
class least_squares_solver {
 public:
  least_squares_solver(std::size_t rows, std::size_t columns, std::size_t right_sides = 1)
      : count_(columns * right_sides),
        a_count_(rows * columns),
        b_count_(rows * right_sides),
        solver_(detail::make<owned>([&](lumra_least_squares **out) {
          lumra_least_squares_options how = LUMRA_LEAST_SQUARES_OPTIONS;
          how.type = detail::type_code<T>;
          how.rows = rows;
          how.columns = columns;
          how.right_sides = right_sides;
          return lumra_least_squares_create(&how, out);
        })) {}

  /// Matrices row by row. NaN for the usual rcond.
  [[nodiscard]] least_squares_solution<T> operator()(std::span<const T> a, std::span<const T> b,
                                                     double rcond = std::numeric_limits<double>::quiet_NaN()) {
    if (a.size() != a_count_ || b.size() != b_count_)
      throw error(status(LUMRA_OUT_OF_RANGE), "a or b has not as many elements as the solver was made for");
    least_squares_solution<T> solution{std::vector<T>(count_), 0};
    std::uint64_t rank = 0;
    check_open(lumra_least_squares_solve(solver_.get(), a.data(), b.data(), rcond, solution.x.data(), &rank));
    solution.rank = static_cast<std::size_t>(rank);
    return solution;
  }

 private:
  using owned = detail::owned<lumra_least_squares, &lumra_least_squares_free>;

  std::size_t count_, a_count_, b_count_;
  owned solver_;
};

}  // namespace lumra
