// SPDX-License-Identifier: MIT
#include "recording/raw.hpp"

#include "recording/failure.hpp"
#include "recording/file.hpp"

namespace recording {

source open_raw(const std::filesystem::path &path, const options &said) {
  const std::uint64_t size = readable_size(path);
  source result;
  result.name = path.filename().string();
  result.data = path;
  result.files = {path};
  if (const auto format = said.format ? parse_format(*said.format) : format_of_suffix(path))
    result.format = *format;
  else
    throw failure("{}: sample type unknown; say it with {} ({})", path.string(), said.names.format, known_formats);
  if (said.capture) throw failure("{}: a raw file has no captures; leave out {}", path.string(), said.names.capture);
  if (!said.rate) throw failure("{}: a raw file has no sample rate; say it with {} HZ", path.string(), said.names.rate);
  result.rate = *said.rate;
  const std::size_t width = result.format.bytes();
  if (size % width != 0)
    throw failure(
        "{}: {} bytes are no whole number of {} samples ({} bytes each); is the file complete, the type right?",
        path.string(), size, result.format.name(), width);
  result.extents = {{0, size / width}};
  return result;
}

}  // namespace recording
