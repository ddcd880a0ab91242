// Coefficients of filters. SPDX-License-Identifier: MIT
#pragma once

#include <vector>

#include "arrays.hpp"

namespace binding {

/// One or more real numbers; a number alone is one. Throws TypeError and ValueError.
std::vector<double> real_coefficients(py::handle given, const char *name);
/// Rows of b[0], b[1], b[2], a[0], a[1], a[2], behind each other. The same.
std::vector<double> sections(py::handle given);

/// Samples of one call without the GIL in between: some tens of milliseconds of a filter with so many coefficients.
constexpr std::size_t filtered_at_once(std::size_t coefficients) noexcept {
  return std::clamp((std::size_t{1} << 25) / std::max<std::size_t>(coefficients, 1), std::size_t{64},
                    std::size_t{1} << 18);
}

}  // namespace binding
