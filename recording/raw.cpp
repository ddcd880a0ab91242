// SPDX-License-Identifier: MIT
#include "recording/raw.hpp"

#include "recording/failure.hpp"
#include "recording/file.hpp"

namespace recording {
namespace {

source open_bytes(const std::filesystem::path &path, const std::optional<sample_format> &format, const options &said) {
  const std::string name = path.string();
  if (!format) throw failure("{}: sample type unknown; say it with {} ({})", name, said.names.format, known_formats);
  if (said.capture) throw failure("{}: a raw file has no captures; leave out {}", name, said.names.capture);
  if (!said.rate) throw failure("{}: a raw file has no sample rate; say it with {} HZ", name, said.names.rate);
  source result;
  result.format = *format;
  result.datatype = format->name();
  result.rate = *said.rate;
  result.data = path;
  return result;
}

void hold(source &result, std::uint64_t samples) {
  result.samples = samples;
  result.captures.emplace_back().samples = samples;
  result.extents = {{0, samples, 0}};
}

}  // namespace

source open_raw(const std::filesystem::path &path, const options &said) {
  const std::uint64_t size = readable_size(path);
  source result = open_bytes(path, said.format ? parse_format(*said.format) : format_of_suffix(path), said);
  result.name = path.filename().string();
  result.files = {path};
  const std::size_t width = result.format.bytes();
  if (size % width != 0)
    throw failure(
        "{}: {} bytes are no whole number of {} samples ({} bytes each); is the file complete, the type right?",
        path.string(), size, result.datatype, width);
  hold(result, size / width);
  result.bytes = [path] { return read_file(path); };
  return result;
}

source open_standard_input(const options &said) {
  source result =
      open_bytes("standard input", said.format ? std::optional(parse_format(*said.format)) : std::nullopt, said);
  result.name = "standard input";
  hold(result, endless);
  result.ranged = false;
  result.bytes = [] { return read_standard_input(); };
  return result;
}

}  // namespace recording
