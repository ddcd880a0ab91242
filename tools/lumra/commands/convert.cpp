// lumra convert: a recording in another form: SigMF of any type, an archive, WAV. SPDX-License-Identifier: MIT
#include <fmt/core.h>

#include <algorithm>
#include <complex>
#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <vector>

#include "commands/arguments.hpp"
#include "commands/commands.hpp"
#include "commands/sigmf_result.hpp"
#include "recording/derived_metadata.hpp"
#include "recording/open.hpp"
#include "recording/sample_encoder.hpp"
#include "recording/sample_reader.hpp"
#include "recording/sigmf_archive_writer.hpp"
#include "recording/sigmf_writer.hpp"
#include "recording/wav.hpp"
#include "terminal/failure.hpp"
#include "terminal/progress.hpp"
#include "terminal/results.hpp"

namespace tool {
namespace {

namespace fs = std::filesystem;
using nlohmann::json;
using recording::endless;

constexpr std::size_t block_samples = std::size_t{1} << 14;

struct convert_command {
  std::string path, output, datatype;
  recording::options options;
  output_arguments outputs;
};

struct conversion {
  std::string datatype;
  std::uint64_t samples = 0, clipped = 0;
};

/// Reads the samples chosen and writes them; gives how many they were.
std::uint64_t copy(const recording::source &source, recording::sample_encoder &to, bool to_complex) {
  recording::sample_reader reader(source, source.chosen_first, source.chosen_samples);
  progress bar("Converting");
  std::vector<std::complex<double>> samples(to_complex ? block_samples : 0);
  std::vector<double> real(to_complex ? 0 : block_samples);
  for (;;) {
    const std::size_t count = to_complex ? reader.read(samples) : reader.read(real);
    if (count == 0) return reader.position();
    if (to_complex)
      to.write(std::span<const std::complex<double>>(samples).first(count));
    else
      to.write(std::span<const double>(real).first(count));
    if (source.chosen_samples != endless) bar.update(reader.position(), source.chosen_samples);
  }
}

json metadata_of(const recording::source &source, std::uint64_t samples, const std::string &datatype) {
  return recording::derived_metadata(source, {.pieces = {{source.chosen_first, samples, 0, samples}},
                                              .rate = source.rate,
                                              .frequency = {},
                                              .datatype = datatype,
                                              .description = ""});
}

conversion write_wav(const recording::source &source, recording::sample_format format, output_file &file,
                     const std::string &name) {
  format = recording::wav_format(format);
  recording::wav_writer writer(file.descriptor(), name, format, source.rate, source.chosen_samples);
  recording::sample_encoder encoder(writer, format);
  const std::uint64_t samples = copy(source, encoder, format.is_complex);
  writer.finish();
  return {recording::wav_datatype(format), samples, encoder.clipped()};
}

conversion write_archive(const recording::source &source, const recording::sample_format &format, output_file &file,
                         const std::string &name) {
  if (source.chosen_samples == endless)
    throw failure("{}: an archive begins with its length, which is not known; say --duration, or write a pair of files",
                  source.data.string());
  recording::sigmf_archive_writer writer(file, name, metadata_of(source, source.chosen_samples, format.name()),
                                         source.chosen_samples * format.bytes());
  recording::sample_encoder encoder(writer, format);
  const std::uint64_t samples = copy(source, encoder, format.is_complex);
  if (samples != source.chosen_samples)
    throw failure("{}: ended after {} samples; write a pair of files", source.data.string(), samples);
  writer.finish();
  return {format.name(), samples, encoder.clipped()};
}

conversion write_pair(const recording::source &source, const recording::sample_format &format, output_file &data,
                      output_file &metadata) {
  recording::sample_encoder encoder(data, format);
  const std::uint64_t samples = copy(source, encoder, format.is_complex);
  write_metadata(metadata, metadata_of(source, samples, format.name()));
  return {format.name(), samples, encoder.clipped()};
}

results run(const convert_command &command) {
  const recording::source source = recording::open(command.path, command.options);
  if (source.chosen_samples == 0) throw failure("{}: holds no samples", source.data.string());
  const recording::sample_format format = result_format(source, command.datatype, source.format);
  const fs::path target = result_base(command.output);

  results given(source.files);
  const output_files files = begin_outputs(given, command.outputs);
  conversion made;
  given.add_line("Recording", fmt::format("{} ({})", source.data.string(), source.datatype));
  if (target.extension() == ".wav") {
    made = write_wav(source, format, given.add_file(target), target.string());
    given.add_line("WAV file", target.string());
  } else if (target.extension() == ".sigmf") {
    made = write_archive(source, format, given.add_file(target), target.stem().string());
    given.add_line("Archive", target.string());
  } else {
    const recording::sigmf_files names = recording::sigmf_files_of(target);
    output_file &data = given.add_file(names.data);
    made = write_pair(source, format, data, given.add_file(names.metadata));
    given.add_line("Data", names.data.string());
    given.add_line("Metadata", names.metadata.string());
  }
  given.add_line("Samples", fmt::format("{} ({:.6g} s) of type {}", made.samples,
                                        static_cast<double>(made.samples) / source.rate, made.datatype));
  given.add_line("Clipped", made.clipped == 0 ? "none" : fmt::format("{} samples beyond full scale", made.clipped));
  if (files.json)
    write_json(*files.json, {{"samples", made.samples}, {"datatype", made.datatype}, {"clipped", made.clipped}});
  if (files.csv)
    files.csv->print("samples,datatype,clipped\n{},{},{}\n", made.samples, csv_text(made.datatype), made.clipped);
  add_output_lines(given, command.outputs);
  return given;
}

}  // namespace

void add_convert(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<convert_command>();
  CLI::App *app = add_command(program, "convert", "A recording as SigMF of any type, as an archive or as WAV");
  app->footer(
      "Captures and annotations are carried over, with the indices of the samples that are written. Samples are "
      "rounded "
      "to the nearest value of the type; those beyond its full scale are limited to it and counted.");
  app->add_option("RECORDING", command->path, recording_help)->required();
  app->add_option("--output", command->output,
                  "Write this WAV file (.wav) or archive (.sigmf), or else BASE.sigmf-data and BASE.sigmf-meta")
      ->option_text("FILE|BASE")
      ->required();
  app->add_option("--datatype", command->datatype, "Sample type to write (default: that of the recording)")
      ->option_text("NAME");
  add_recording_options(*app, command->options);
  add_capture_option(*app, command->options, "Convert this capture of a SigMF recording alone, from 0");
  add_outputs(*app, command->outputs, {"Write the figures", nullptr, false, false});
  app->callback([command, &work] { work = [command] { return run(*command); }; });
}

}  // namespace tool
