// Filters that go on from block to block. SPDX-License-Identifier: MIT
#pragma once

#include <pybind11/pybind11.h>

namespace binding {

void add_stream_filters(pybind11::module_ &module);

}  // namespace binding
