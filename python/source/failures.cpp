// SPDX-License-Identifier: MIT
#include "failures.hpp"

#include <algorithm>
#include <array>
#include <cctype>
#include <cmath>
#include <cstring>
#include <lumra/error.hpp>
#include <string_view>
#include <utility>

namespace binding {
namespace {

/// What the library's sentences call an argument, and what Python's callers do; of names that begin alike the longer
/// first.
constexpr std::array<std::pair<std::string_view, std::string_view>, 16> argument_names{{
    {"options->points", "nfft"},
    {"options->sample_rate_hz", "sample_rate"},
    {"options->centre_hz", "frequency"},
    {"options->window_parameter", "window"},
    {"options->distance_hz", "distance"},
    {"options->near_hz", "frequency"},
    {"options->", ""},
    {"adjacent_bandwidth_hz", "adjacent_bandwidth"},
    {"bandwidth_hz", "bandwidth"},
    {"centre_hz", "center"},
    {"offsets_hz", "offsets"},
    {"input_rate", "rate_in"},
    {"output_rate", "rate_out"},
    {"rejection_db", "rejection"},
    {"sample_rate_hz", "sample_rate"},
    {"parameter", "window parameter"},
}};

/// The sentence without the C function's name, in Python's names.
std::string in_our_names(std::string_view sentence) {
  if (sentence.starts_with("lumra_"))
    if (const auto end = sentence.find(": "); end != std::string_view::npos) sentence.remove_prefix(end + 2);
  std::string text;
  while (!sentence.empty()) {
    const bool begins = text.empty() || (!std::isalnum(static_cast<unsigned char>(text.back())) && text.back() != '_');
    const auto *known = std::find_if(argument_names.begin(), argument_names.end(),
                                     [&](const auto &each) { return begins && sentence.starts_with(each.first); });
    if (known != argument_names.end()) {
      text += known->second;
      sentence.remove_prefix(known->first.size());
    } else {
      text += sentence.front();
      sentence.remove_prefix(1);
    }
  }
  return text;
}

void raise_error(const std::string &sentence, int code) {
  const py::object type = py::module_::import("lumra._failures").attr("Error");
  const py::object made = type(sentence, code);
  PyErr_SetObject(type.ptr(), made.ptr());
}

}  // namespace

void refuse_value(const std::string &name, const std::string &value, const std::string &right) {
  throw py::value_error(name + " is " + value + "; " + right);
}

void refuse_type(const std::string &name, const std::string &value, const std::string &right) {
  throw py::type_error(name + " is " + value + "; " + right);
}

std::string text_of(py::handle object) {
  constexpr std::size_t longest = 60;
  std::string text;
  try {
    text = py::repr(object);
  } catch (py::error_already_set &) {
    text = "an object without a representation";
  }
  if (text.size() > longest) {
    std::size_t end = longest;
    while ((static_cast<unsigned char>(text[end]) & 0xC0U) == 0x80U) --end;  // not inside of a character
    text = text.substr(0, end) + "...";
  }
  return text + " (" + Py_TYPE(object.ptr())->tp_name + ")";
}

std::int64_t whole_number(py::handle object, const char *name, std::int64_t least) {
  constexpr std::int64_t most = std::int64_t{1} << 62;
  const auto index = py::reinterpret_steal<py::object>(PyNumber_Index(object.ptr()));
  if (!index) {
    PyErr_Clear();
    refuse_type(name, text_of(object), "give a whole number");
  }
  int overflow = 0;
  const long long value = PyLong_AsLongLongAndOverflow(index.ptr(), &overflow);
  if (overflow != 0 || value < least || value > most)
    refuse_value(name, text_of(object), "give a whole number from " + std::to_string(least) + " to 2^62");
  return value;
}

std::uint32_t number_of_threads(py::handle threads) {
  if (threads.is_none()) return 0;
  constexpr std::int64_t most = 1024;
  const std::int64_t count = whole_number(threads, "threads", 1);
  if (count > most) refuse_value("threads", text_of(threads), "give at most 1024, or None");
  return static_cast<std::uint32_t>(count);
}

double number(py::handle object, const char *name) {
  const double value = PyFloat_AsDouble(object.ptr());
  if (value == -1.0 && PyErr_Occurred() != nullptr) {
    PyErr_Clear();
    refuse_type(name, text_of(object), "give a number");
  }
  if (std::isnan(value)) refuse_value(name, text_of(object), "give a number");
  return value;
}

void translate_failures() {
  // pybind11 wants this signature. NOLINTNEXTLINE(performance-unnecessary-value-param)
  py::register_exception_translator([](std::exception_ptr thrown) {
    try {
      if (thrown) std::rethrow_exception(thrown);
    } catch (const lumra::error &failed) {
      const int code = failed.status().code();
      const std::string sentence = in_our_names(failed.what());
      if (code == LUMRA_OUT_OF_RANGE || code == LUMRA_UNKNOWN_CHOICE || code == LUMRA_WRONG_TYPE)
        PyErr_SetString(PyExc_ValueError, sentence.c_str());
      else
        raise_error(sentence, code);
    } catch (const py::builtin_exception &) {
      throw;                                      // ValueError and its like
    } catch (const std::runtime_error &failed) {  // of files, for one
      raise_error(failed.what(), LUMRA_UNEXPECTED);
    }
  });
}

}  // namespace binding
