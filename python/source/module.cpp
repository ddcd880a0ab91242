// The extension module lumra._lumra. Its functions take their arguments in order; the package's Python modules give them
// names, defaults and documentation. SPDX-License-Identifier: MIT
#include "module.hpp"

#include "failures.hpp"
#include "patience.hpp"

PYBIND11_MODULE(_lumra, module) {
  binding::translate_failures();
  binding::add_elements(module);
  binding::add_error_vectors(module);
  binding::add_figures(module);
  binding::add_filters(module);
  binding::add_least_squares(module);
  binding::add_levels(module);
  binding::add_patience();
  binding::add_rates(module);
  binding::add_recordings(module);
  binding::add_spectra(module);
  binding::add_transforms(module);
  binding::add_windows(module);
  module.def("number_of_threads", &binding::number_of_threads);
}
