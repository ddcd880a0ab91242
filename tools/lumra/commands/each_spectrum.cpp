// SPDX-License-Identifier: MIT
#include "commands/each_spectrum.hpp"

#include <vector>

#include "commands/inputs.hpp"
#include "pictures/gnuplot.hpp"

namespace tool {

results each_spectrum(const input_arguments &inputs, const spectrum_arguments &arguments,
                      const output_arguments &outputs, const std::function<void(output_file &csv)> &begin,
                      const std::function<void(const measured_spectrum &)> &give) {
  const std::vector<recording::source> sources = open_all(inputs);
  results given(files_of(sources));
  // Made first, so that an output that cannot be written is known before the work.
  const output_files files = begin_outputs(given, outputs);
  if (files.csv) begin(*files.csv);
  spectrum_picture picture;
  picture.title = title_of(sources);
  picture.is_shared = sources.size() > 1;
  picture.level_unit = outputs.level_unit();
  for (const recording::source &source : sources) {
    selection chosen = select_frequency(source);
    const lumra::averaged_spectrum spectrum = average(source, chosen, settings_for(arguments, source, chosen, outputs));
    given.add_gap();
    add_recording_lines(given, source, chosen);
    add_spectrum_lines(given, arguments, spectrum, outputs);
    give({source, spectrum, given, files, files.plot ? &picture : nullptr});
  }
  if (files.plot) draw(spectrum_script(picture, files.type), files.type, *files.plot);
  add_output_lines(given, outputs);
  return given;
}

}  // namespace tool
