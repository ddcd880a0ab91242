// Options that several subcommands take. SPDX-License-Identifier: MIT
#pragma once

#include <CLI/CLI.hpp>

#include "recording/options.hpp"

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

/// Adds the options for rate and format, which describe raw files and override metadata, and for the capture, under the
/// names that the options carry.
void add_recording_options(CLI::App &app, recording::options &options);
/// Adds the option for the capture alone.
void add_capture_option(CLI::App &app, recording::options &options, const char *help);

}  // namespace tool
