// Any bytes as samples of every type, in pieces of any size, against their definition. SPDX-License-Identifier: MIT
#include <bit>
#include <cmath>
#include <complex>
#include <cstdint>
#include <vector>

#include "program_scratch.hpp"
#include "recording/failure.hpp"
#include "recording/open.hpp"
#include "recording/sample_reader.hpp"

namespace {

constexpr struct {
  const char *name;
  std::size_t bytes;
  char kind;
} types[] = {{"f32", 4, 'f'}, {"f64", 8, 'f'}, {"i8", 1, 'i'},  {"i16", 2, 'i'},
             {"i32", 4, 'i'}, {"u8", 1, 'u'},  {"u16", 2, 'u'}, {"u32", 4, 'u'}};

/// The component whose bytes these are, the most significant one first.
double value_of(std::uint64_t bits, std::size_t bytes, char kind) {
  if (kind == 'f' && bytes == 4) return static_cast<double>(std::bit_cast<float>(static_cast<std::uint32_t>(bits)));
  if (kind == 'f') return std::bit_cast<double>(bits);
  const double half = std::ldexp(1.0, static_cast<int>(8 * bytes) - 1);
  const auto value = static_cast<double>(bits);
  if (kind == 'u') return (value - (half - 0.5)) / (half - 0.5);
  return (value < half ? value : value - 2 * half) / half;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  if (size < 2) return 0;
  static const fuzz::scratch_folder folder;
  const auto &type = types[data[0] % std::size(types)];
  const bool big_endian = data[0] >= 128, is_complex = (data[0] & 8) == 0;
  const std::size_t parts = is_complex ? 2 : 1;
  std::uint32_t pieces = data[1];
  data += 2;
  size -= 2;
  folder.write("x.bin", {reinterpret_cast<const char *>(data), size});

  std::vector<double> expected;
  for (std::size_t at = 0; at + type.bytes <= size; at += type.bytes) {
    std::uint64_t bits = 0;
    for (std::size_t i = 0; i < type.bytes; ++i) bits = bits << 8 | data[at + (big_endian ? i : type.bytes - 1 - i)];
    expected.push_back(value_of(bits, type.bytes, type.kind));
  }
  const auto bad =
      std::find_if(expected.begin(), expected.end(), [](double x) { return !std::isfinite(static_cast<float>(x)); });
  const auto first_bad = static_cast<std::size_t>(bad - expected.begin()) / parts;

  std::uint64_t read = 0;
  try {
    recording::options options;
    options.rate = 1;
    options.format = (is_complex ? "c" : "r") + std::string(type.name) + (big_endian ? "_be" : "_le");
    const recording::source source = recording::open(folder.path() / "x.bin", options);
    fuzz::require(parts * source.samples == expected.size() && size % (parts * type.bytes) == 0,
                  "all samples are there");
    recording::sample_reader reader(source, 0, source.samples);
    std::vector<std::complex<float>> piece;
    while (read < source.samples) {
      pieces = 1664525 * pieces + 1013904223;
      piece.resize(std::min<std::uint64_t>(1 + (pieces >> 24), source.samples - read));
      fuzz::require(reader.read(piece) == piece.size(), "all samples are read");
      for (std::size_t i = 0; i < 2 * piece.size(); ++i) {
        const double exact = is_complex ? expected[2 * read + i] : i % 2 == 0 ? expected[read + i / 2] : 0;
        const double got = reinterpret_cast<const float *>(piece.data())[i];
        // Single precision rounds by half a unit, the scaling in double precision by almost nothing.
        fuzz::require(std::abs(got - exact) <= 0x1.0001p-24 * std::abs(exact) + 0x1p-150, "the value is the sample's");
      }
      read += piece.size();
    }
    fuzz::require(bad == expected.end(), "what is not finite is refused");
  } catch (const recording::failure &failure) {
    const std::string text = failure.what();
    fuzz::require_one_line(text);
    const std::string reason = size % (parts * type.bytes) != 0 ? std::string("no whole number")
                               : bad != expected.end() ? "sample " + std::to_string(first_bad) + " is not a finite"
                                                       : "nothing to refuse";
    fuzz::require(text.find(reason) != std::string::npos, reason.c_str(), text);
  }
  return 0;
}
