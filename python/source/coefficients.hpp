// Coefficients of filters. SPDX-License-Identifier: MIT
#pragma once

#include <vector>

#include "arrays.hpp"

namespace binding {

/// One or more real numbers; a number alone is one. Throws TypeError and ValueError.
std::vector<double> real_coefficients(py::handle given, const char *name);
/// Rows of b[0], b[1], b[2], a[0], a[1], a[2], behind each other. The same.
std::vector<double> sections(py::handle given);

}  // namespace binding
