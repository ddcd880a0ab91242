// Windows by the names that Python's callers use. SPDX-License-Identifier: MIT
#pragma once

#include <pybind11/pybind11.h>

#include <lumra/window.hpp>

namespace binding {

/// A name, or ("kaiser", beta). Throws TypeError and ValueError.
lumra::window_shape window_of(pybind11::handle name);

}  // namespace binding
