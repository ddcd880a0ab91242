// Any bytes as archive, WAV and raw file: what opens is read to its end, and two readers read the same.
// SPDX-License-Identifier: MIT
#include <complex>
#include <cstdint>
#include <vector>

#include "program_scratch.hpp"
#include "recording/failure.hpp"
#include "recording/open.hpp"
#include "recording/sample_reader.hpp"

namespace {

constexpr const char *names[] = {"x.sigmf", "x.sigmf.gz", "x.tar.xz", "x.wav", "x.w64", "x.rf64", "x.ri16_be", "x.cu8"};
/// A short file that is unpacked may become longer than there is time for.
constexpr std::uint64_t most_samples = 1 << 16;

void read_all(const recording::source &source) {
  const std::uint64_t samples = std::min(source.chosen_samples, most_samples);
  std::vector<std::complex<double>> all(samples), piece(301);
  recording::sample_reader reader(source, source.chosen_first, samples);
  fuzz::require(reader.read(all) == samples, "all samples are read");
  if (!source.ranged || samples < 2) return;
  recording::sample_reader second(source, source.chosen_first, samples);
  second.seek(samples / 2);
  const std::size_t count = second.read(piece);
  fuzz::require(std::equal(piece.begin(), piece.begin() + static_cast<std::ptrdiff_t>(count),
                           all.begin() + static_cast<std::ptrdiff_t>(samples / 2)),
                "a reader that begins in the middle reads the same");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  if (size < 2) return 0;
  static const fuzz::scratch_folder folder;
  const std::string name = names[data[0] % std::size(names)];
  folder.write(name, {reinterpret_cast<const char *>(data + 2), size - 2});
  recording::options said;
  if (data[1] & 1) said.rate = 1;
  if (data[1] & 2) said.start = data[1] >> 4;
  if (data[1] & 4) said.channel = data[1] >> 6;
  try {
    const recording::source source = recording::open(folder.path() / name, said);
    fuzz::require(source.captures.size() > 0 && source.rate > 0, "what opens has captures and a rate");
    read_all(source);
  } catch (const recording::failure &failure) {
    fuzz::require(std::string_view(failure.what()).find('\0') == std::string_view::npos, "a sentence");
  }
  return 0;
}
