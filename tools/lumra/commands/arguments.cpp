// SPDX-License-Identifier: MIT
#include "commands/arguments.hpp"

#include <cmath>

namespace tool {

CLI::Validator positive_number() {
  return number_where("a positive number", [](double value) { return value > 0 && std::isfinite(value); });
}

void add_recording_options(CLI::App &app, recording::options &options) {
  app.add_option(options.names.rate, options.rate,
                 "Sample rate as recorded; needed for raw files, overrides the metadata")
      ->option_text("HZ")
      ->check(positive_number());
  app.add_option(options.names.format, options.format,
                 "Sample type (cf32, cf64, ci32, ci16, ci8, cu32, cu16, cu8; _le or _be); overrides the metadata")
      ->option_text("NAME");
  add_capture_option(app, options, "Use this capture of a SigMF recording alone, from 0");
}

void add_capture_option(CLI::App &app, recording::options &options, const char *help) {
  app.add_option(options.names.capture, options.capture, help)->option_text("INDEX");
}

}  // namespace tool
