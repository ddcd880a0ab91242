// What subcommands that measure averaged spectra do alike: the recordings one by one, with a summary, files and one
// picture for all of them. SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <lumra/spectrum.hpp>

#include "analysis/selection.hpp"
#include "commands/arguments.hpp"
#include "commands/spectrum_options.hpp"
#include "pictures/spectrum_picture.hpp"
#include "recording/source.hpp"
#include "terminal/results.hpp"

namespace tool {

/// The spectrum of one of the recordings, and where its figures go.
struct measured_spectrum {
  const recording::source &source;
  const lumra::averaged_spectrum &spectrum;
  results &given;  // its lines about recording and spectrum are there
  const output_files &files;
  spectrum_picture *picture;  // null where none is drawn
};

/// Calls `begin` with a CSV file that was just begun, and `give` with each recording's spectrum. Throws failure.
results each_spectrum(const input_arguments &inputs, const spectrum_arguments &arguments,
                      const output_arguments &outputs, const std::function<void(output_file &csv)> &begin,
                      const std::function<void(const measured_spectrum &)> &give);

}  // namespace tool
