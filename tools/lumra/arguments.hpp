// Options that several subcommands take. SPDX-License-Identifier: MIT
#pragma once

#include <CLI/CLI.hpp>

#include "recording.hpp"

namespace tool {

/// An option's value must satisfy `holds`; NaN satisfies nothing.
template <class Holds>
CLI::Validator number_where(const char *what, Holds holds) {
  return {[=](std::string &text) {
            double value = 0;
            return CLI::detail::lexical_cast(text, value) && holds(value) ? std::string() : text + " is not " + what;
          },
          ""};
}

CLI::Validator positive_number();

/// The options for rate and format, which describe raw files and override metadata.
void add_recording_options(CLI::App &app, recording_options &options);

}  // namespace tool
