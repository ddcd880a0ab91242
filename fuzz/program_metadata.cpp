// Any bytes as metadata: what is read lies in the data file, and what is written from it is metadata again.
// SPDX-License-Identifier: MIT
#include <complex>
#include <cstdint>
#include <nlohmann/json.hpp>
#include <vector>

#include "program_scratch.hpp"
#include "recording/derived_metadata.hpp"
#include "recording/failure.hpp"
#include "recording/metadata_text.hpp"
#include "recording/open.hpp"
#include "recording/sample_reader.hpp"
#include "recording/sigmf_writer.hpp"
#include "terminal/printable.hpp"
#include "terminal/results.hpp"

namespace {

constexpr std::size_t data_bytes = 3000;
constexpr double ratio = 2.5;

void require_in_file(const recording::source &source, std::uint64_t size) {
  const std::size_t frame = source.channels * source.format.bytes();
  std::uint64_t end = 0;
  for (const recording::extent &e : source.extents) {
    fuzz::require(e.offset >= end && e.offset <= size, "extents follow each other");
    fuzz::require(e.samples <= (size - e.offset) / frame, "extents end in the file");
    end = e.offset + e.samples * frame;
  }
}

void read_all(const recording::source &source) {
  std::vector<std::complex<float>> piece(97);
  std::uint64_t end = source.chosen_first;
  for (const recording::stretch &each : source.stretches) {
    fuzz::require(each.first >= end && each.samples > 0, "stretches follow each other");
    end = each.first + each.samples;
    recording::sample_reader reader(source, each);
    std::uint64_t read = 0;
    while (const std::size_t count = reader.read(piece)) read += count;
    fuzz::require(read == each.samples, "all of a stretch is read");
  }
  fuzz::require(end <= source.chosen_first + source.chosen_samples, "stretches lie in what was chosen");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  static const fuzz::scratch_folder folder;
  static const bool prepared = (folder.write("x.sigmf-data", std::string(data_bytes, '\0')), true);
  fuzz::require(prepared, "a data file");
  folder.write("x.sigmf-meta", {reinterpret_cast<const char *>(data), size});
  try {
    const recording::source source = recording::open(folder.path() / "x", {});
    require_in_file(source, std::filesystem::file_size(source.data));
    if (source.stretches.empty()) return 0;
    // Zeros are samples of every type; the metadata may name themselves as data.
    if (source.data.filename() == "x.sigmf-data") read_all(source);
    const auto samples = static_cast<std::uint64_t>(static_cast<double>(source.chosen_samples) / ratio) + 1;
    tool::results given(source.files);
    const recording::sigmf_files files = recording::sigmf_files_of(folder.path() / "y");
    const std::vector<recording::derived_piece> whole = {{source.chosen_first, source.chosen_samples, 0, samples}};
    const std::string text =
        recording::metadata_text(recording::derived_metadata(source, {.pieces = whole,
                                                                      .rate = source.rate / ratio,
                                                                      .frequency = {},
                                                                      .datatype = "cf32_le",
                                                                      .description = "resampled"}));
    (void)given.add_file(files.data);
    given.add_file(files.metadata).write(std::as_bytes(std::span(text)));
    given.deliver();
  } catch (const recording::failure &failure) {
    fuzz::require_one_line(tool::printable(failure.what()));
    return 0;
  }
  const auto written = recording::read_metadata(folder.path() / "y.sigmf-meta");
  fuzz::require(written.at("global").is_object(), "what is written is metadata");
  fuzz::require(std::filesystem::file_size(folder.path() / "y.sigmf-meta") <= 16 * size + 4096,
                "the size is in proportion");
  return 0;
}
