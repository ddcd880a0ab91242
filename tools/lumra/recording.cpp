// SPDX-License-Identifier: MIT
#include "recording.hpp"

#include <unistd.h>

#include <system_error>

#include "failure.hpp"
#include "sigmf.hpp"

namespace tool {
namespace {

namespace fs = std::filesystem;

/// Whether there is a regular file of this name, as far as can be seen.
bool is_file(const fs::path &file) noexcept {
  std::error_code error;
  return fs::is_regular_file(fs::status(file, error));
}

recording open_raw(const fs::path &path, const recording_options &options) {
  const std::uint64_t size = readable_size(path);
  recording result;
  result.name = path.filename().string();
  result.data = path;
  result.files = {path};
  if (const auto format = options.format ? parse_format(*options.format) : format_of_suffix(path))
    result.format = *format;
  else
    throw failure("{}: sample type unknown; say it with --format ({})", path.string(), known_formats);
  if (options.capture) throw failure("{}: a raw file has no captures; leave out --capture", path.string());
  if (!options.rate)
    throw failure("{}: a raw file has no sample rate; say it with {} HZ", path.string(), options.rate_option);
  result.rate = *options.rate;
  const std::size_t width = result.format.bytes();
  if (size % width != 0)
    throw failure(
        "{}: {} bytes are no whole number of {} samples ({} bytes each); is the file complete, the type right?",
        path.string(), size, result.format.name(), width);
  result.extents = {{0, size / width}};
  return result;
}

}  // namespace

std::uint64_t recording::samples() const noexcept {
  std::uint64_t sum = 0;
  for (const extent &e : extents) sum += e.samples;
  return sum;
}

std::uint64_t readable_size(const fs::path &file) {
  std::error_code error;
  const fs::file_status status = fs::status(file, error);
  if (!fs::exists(status)) throw failure("{}: {}", file.string(), error ? error.message() : "no such file");
  if (!fs::is_regular_file(status))
    throw failure("{}: not a regular file; save the samples to a file first", file.string());
  const std::uint64_t size = fs::file_size(file, error);
  if (!error && ::access(file.c_str(), R_OK) != 0) error = {errno, std::generic_category()};
  if (error) throw failure("{}: {}", file.string(), error.message());
  return size;
}

recording open_recording(const fs::path &path, const recording_options &options) {
  const fs::path suffix = path.extension();
  if (suffix == ".sigmf")
    throw failure("{}: SigMF archives are not read; unpack it with: tar -xf {}", path.string(), path.string());
  if (suffix == ".sigmf-collection")
    throw failure("{}: a collection names several recordings; give one of them", path.string());
  if (suffix == ".sigmf-meta") return open_sigmf(path, options);
  if (suffix == ".sigmf-data") {
    readable_size(path);
    fs::path meta = path;
    meta.replace_extension(".sigmf-meta");
    if (is_file(meta)) return open_sigmf(meta, options);
    if (!options.format)
      throw failure("{}: no {} beside it; say --format and {}", path.string(), meta.string(), options.rate_option);
    return open_raw(path, options);
  }
  fs::path meta = path;
  meta += ".sigmf-meta";
  if (!is_file(path) && is_file(meta)) return open_sigmf(meta, options);
  return open_raw(path, options);
}

}  // namespace tool
