// SPDX-License-Identifier: MIT
#include "arguments.hpp"

#include <cmath>

namespace tool {

CLI::Validator positive_number() {
  return number_where("a positive number", [](double value) { return value > 0 && std::isfinite(value); });
}

void add_recording_options(CLI::App &app, recording_options &options) {
  app.add_option(options.rate_option, options.rate,
                 "Sample rate as recorded; needed for raw files, overrides the metadata")
      ->option_text("HZ")
      ->check(positive_number());
  app.add_option("--format", options.format,
                 "Sample type (cf32, cf64, ci32, ci16, ci8, cu32, cu16, cu8; _le or _be); overrides the metadata")
      ->option_text("NAME");
}

}  // namespace tool
