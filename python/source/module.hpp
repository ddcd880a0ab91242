// The parts of the extension module, one for each subject. SPDX-License-Identifier: MIT
#pragma once

#include <pybind11/pybind11.h>

namespace binding {

void add_elements(pybind11::module_ &module);
void add_error_vectors(pybind11::module_ &module);
void add_figures(pybind11::module_ &module);
void add_filters(pybind11::module_ &module);
void add_least_squares(pybind11::module_ &module);
void add_levels(pybind11::module_ &module);
void add_rates(pybind11::module_ &module);
void add_recordings(pybind11::module_ &module);
void add_spectra(pybind11::module_ &module);
void add_transforms(pybind11::module_ &module);
void add_windows(pybind11::module_ &module);

}  // namespace binding
