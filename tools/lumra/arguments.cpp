// SPDX-License-Identifier: MIT
#include "arguments.hpp"

#include <cmath>

namespace tool {

void add_recording_options(CLI::App &app, std::optional<double> &rate, std::optional<std::string> &format) {
  app.add_option("--rate", rate, "Sample rate; needed for raw files, overrides the metadata")
      ->option_text("HZ")
      ->check(number_where("a positive number", [](double value) { return value > 0 && std::isfinite(value); }));
  app.add_option("--format", format,
                 "Sample type (cf32, cf64, ci32, ci16, ci8, cu32, cu16, cu8; _le or _be); overrides the metadata")
      ->option_text("NAME");
}

}  // namespace tool
