// Follows SigMF 1.2: sample indices count from core:offset; every capture may have header bytes of its own in front of
// its samples. SPDX-License-Identifier: MIT
#include "recording/sigmf.hpp"

#include <cmath>
#include <nlohmann/json.hpp>

#include "recording/failure.hpp"
#include "recording/file.hpp"
#include "recording/metadata_fields.hpp"
#include "recording/metadata_file.hpp"

namespace recording {
namespace {

namespace fs = std::filesystem;
using nlohmann::json;

struct capture {
  std::uint64_t start = 0;  // index of the first sample
  std::uint64_t header_bytes = 0;
  std::optional<double> frequency;
  std::optional<std::uint64_t> global_index;
};

std::vector<capture> read_captures(const json &root, const fs::path &meta) {
  const auto list = root.find("captures");
  if (list == root.end()) return {capture{}};
  if (!list->is_array()) throw failure("{}: captures must be a list", meta.string());
  std::vector<capture> captures;
  for (const json &item : *list) {
    const fields of_capture(item, fmt::format("{}: capture {}", meta.string(), captures.size()));
    capture next;
    next.start = of_capture.count("core:sample_start").value_or(0);
    next.header_bytes = of_capture.count("core:header_bytes").value_or(0);
    next.frequency = of_capture.number("core:frequency");
    next.global_index = of_capture.count("core:global_index");
    if (next.frequency && !std::isfinite(*next.frequency))
      throw failure("{}: core:frequency is not finite", of_capture.where());
    if (!captures.empty() && next.start < captures.back().start)
      throw failure("{}: core:sample_start lies before that of the capture in front", of_capture.where());
    captures.push_back(next);
  }
  return captures.empty() ? std::vector{capture{}} : captures;
}

/// One spectrum needs one centre frequency and samples without a gap.
void require_one_signal(const std::vector<capture> &captures, const fs::path &meta, const option_names &names) {
  for (std::size_t i = 1; i < captures.size(); ++i) {
    const capture &before = captures[i - 1];
    const capture &now = captures[i];
    if (now.frequency && before.frequency != now.frequency)
      throw failure("{}: captures {} and {} differ in centre frequency; choose one with {}", meta.string(), i - 1, i,
                    names.capture);
    if (before.global_index && now.global_index && *now.global_index - *before.global_index != now.start - before.start)
      throw failure("{}: samples are missing between captures {} and {}; choose one with {}", meta.string(), i - 1, i,
                    names.capture);
  }
}

fs::path data_file(const fields &global, const fs::path &meta) {
  const auto dataset = global.text("core:dataset");
  if (!dataset) return fs::path(meta).replace_extension(".sigmf-data");
  if (dataset->empty() || dataset->find('\0') != std::string::npos || fs::path(*dataset).has_parent_path())
    throw failure("{}: core:dataset must be the name of a file in the same folder", meta.string());
  return meta.parent_path() / *dataset;
}

/// Where the samples of each capture lie. Headers stand in front of their captures.
std::vector<extent> locate(const std::vector<capture> &captures, std::uint64_t first_index, std::uint64_t data_bytes,
                           std::size_t width, const fs::path &data) {
  std::vector<extent> extents;
  std::uint64_t headers = 0;
  for (std::size_t i = 0; i < captures.size(); ++i) {
    if (captures[i].start < first_index)
      throw failure("{}: capture {} starts before core:offset; correct the metadata", data.string(), i);
    headers += captures[i].header_bytes;
    const std::uint64_t begin = headers + (captures[i].start - first_index) * width;
    if (begin > data_bytes)
      throw failure("{}: ends before capture {} begins (byte {} of {}); is the file complete?", data.string(), i, begin,
                    data_bytes);
    std::uint64_t bytes = data_bytes - begin;
    if (i + 1 < captures.size())
      bytes = std::min(bytes, (captures[i + 1].start - captures[i].start) * width);
    else if (bytes % width != 0)
      throw failure("{}: its {} bytes of samples are no whole number of samples ({} bytes each); is the file complete?",
                    data.string(), bytes, width);
    extents.push_back({begin, bytes / width});
  }
  return extents;
}

source open_described(const fs::path &meta, const options &said) {
  const auto metadata = std::make_shared<const json>(read_metadata(meta));
  const json &root = *metadata;
  if (!root.is_object() || !root.contains("global")) throw failure("{}: no SigMF metadata (no global)", meta.string());
  const fields global(root["global"], meta.string() + ": global");

  source result;
  result.name = meta.stem().string();
  result.metadata = metadata;
  if (global.is_true("core:metadata_only"))
    throw failure("{}: holds metadata only, there are no samples to analyse", meta.string());
  if (global.count("core:num_channels").value_or(1) != 1)
    throw failure("{}: several channels are interleaved; split them into one recording each", meta.string());

  const auto type = said.format ? said.format : global.text("core:datatype");
  if (!type) throw failure("{}: core:datatype is missing; say {}", meta.string(), said.names.format);
  try {
    result.format = parse_format(*type);
  } catch (const failure &reason) {
    throw failure("{}: {}", meta.string(), reason.what());
  }
  const auto rate = said.rate ? said.rate : global.number("core:sample_rate");
  if (!rate) throw failure("{}: core:sample_rate is missing; say {} HZ", meta.string(), said.names.rate);
  if (!(*rate > 0) || !std::isfinite(*rate))
    throw failure("{}: core:sample_rate {} is not positive; say {} HZ", meta.string(), *rate, said.names.rate);
  result.rate = *rate;

  result.data = data_file(global, meta);
  result.files = {meta, result.data};
  const std::uint64_t size = readable_size(result.data);
  const std::uint64_t trailing = global.count("core:trailing_bytes").value_or(0);
  if (trailing > size) throw failure("{}: shorter than its core:trailing_bytes", result.data.string());

  std::vector<capture> captures = read_captures(root, meta);
  result.extents =
      locate(captures, global.count("core:offset").value_or(0), size - trailing, result.format.bytes(), result.data);
  if (said.capture) {
    if (*said.capture >= captures.size())
      throw failure("{}: no capture {}; there are {}, counted from 0", meta.string(), *said.capture, captures.size());
    const auto chosen = static_cast<std::ptrdiff_t>(*said.capture);
    captures = {captures[static_cast<std::size_t>(chosen)]};
    result.extents = {result.extents[static_cast<std::size_t>(chosen)]};
  }
  require_one_signal(captures, meta, said.names);
  result.frequency = captures.front().frequency;
  result.first_index = captures.front().start;
  return result;
}

}  // namespace

std::optional<source> open_sigmf(const fs::path &path, const options &said) {
  const fs::path suffix = path.extension();
  if (suffix == ".sigmf")
    throw failure("{}: SigMF archives are not read; unpack it with: tar -xf {}", path.string(), path.string());
  if (suffix == ".sigmf-collection")
    throw failure("{}: a collection names several recordings; give one of them", path.string());
  if (suffix == ".sigmf-meta") return open_described(path, said);
  fs::path meta = path;
  if (suffix == ".sigmf-data") {
    readable_size(path);
    meta.replace_extension(".sigmf-meta");
    if (is_file(meta)) return open_described(meta, said);
    if (said.format) return std::nullopt;
    throw failure("{}: no {} beside it; say {} and {}", path.string(), meta.string(), said.names.format,
                  said.names.rate);
  }
  meta += ".sigmf-meta";
  if (!is_file(path) && is_file(meta)) return open_described(meta, said);
  return std::nullopt;
}

}  // namespace recording
