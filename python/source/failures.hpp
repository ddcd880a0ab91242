// How failures reach Python: ValueError and TypeError for wrong arguments, lumra.Error for all else.
// SPDX-License-Identifier: MIT
#pragma once

#include <pybind11/pybind11.h>

#include <string>

namespace binding {

namespace py = pybind11;

/// "name is value; right", the sentence of every refusal.
[[noreturn]] void refuse_value(const std::string &name, const std::string &value, const std::string &right);
[[noreturn]] void refuse_type(const std::string &name, const std::string &value, const std::string &right);
/// The object's repr, cut where it is long, and its type; the GIL is held.
std::string text_of(py::handle object);

/// A whole number from `least` to 2^62. Throws TypeError and ValueError that name it.
std::int64_t whole_number(py::handle object, const char *name, std::int64_t least);
/// A number, not NaN. The same.
double number(py::handle object, const char *name);
/// How many threads may work: a whole number from 1 to 1024, or 0 for None, which is as many as pay. The same.
std::uint32_t number_of_threads(py::handle threads);

/// Makes lumra::error and what recordings throw into Python's exceptions.
void translate_failures();

}  // namespace binding
