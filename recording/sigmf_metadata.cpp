// Follows SigMF 1.2: sample indices count from core:offset; every capture may have header bytes of its own in front of
// its samples. SPDX-License-Identifier: MIT
#include "recording/sigmf_metadata.hpp"

#include <algorithm>
#include <cmath>
#include <nlohmann/json.hpp>

#include "recording/failure.hpp"
#include "recording/metadata_fields.hpp"

namespace recording {
namespace {

namespace fs = std::filesystem;
using nlohmann::json;

/// One frame must fit in memory; no receiver has as many.
constexpr std::uint64_t most_channels = 4096;
/// One mistake may be made in every one of a million items.
constexpr std::size_t most_faults = 100;

void add_fault(source &result, std::string sentence) {
  if (result.faults.size() < most_faults) result.faults.push_back(std::move(sentence));
  if (result.faults.size() == most_faults) result.faults.back() = "there are more faults than are listed";
}

void read_captures(source &result, const std::string &where, std::vector<std::uint64_t> &headers) {
  const auto list = result.metadata->find("captures");
  if (list != result.metadata->end() && !list->is_array()) throw failure("{}: captures must be a list", where);
  std::uint64_t start = 0;  // the metadata's index
  if (list != result.metadata->end())
    for (const json &item : *list) {
      const std::size_t number = result.captures.size();
      const std::string name = fmt::format("{}: capture {}", where, number);
      const fields given(item, name);
      const std::uint64_t next = given.count("core:sample_start").value_or(number == 0 ? result.first_index : 0);
      if (number > 0 && next < start)
        throw failure("{}: core:sample_start lies before that of the capture in front", name);
      start = next;
      if (start < result.first_index)
        throw failure("{}: capture {} starts before core:offset; correct the metadata", where, number);
      capture read{start - result.first_index, 0, given.number("core:frequency"), {}, {}, {}};
      if (read.frequency && !std::isfinite(*read.frequency)) throw failure("{}: core:frequency is not finite", name);
      headers.push_back(given.count("core:header_bytes").value_or(0));
      read.global_index = given.count("core:global_index");
      read.time = given.text("core:datetime").value_or("");
      read.begin = parse_date_time(read.time);
      if (!read.time.empty() && !read.begin)
        add_fault(result, fmt::format("capture {}: core:datetime '{}' is no time such as 2024-05-06T07:08:09.123Z",
                                      number, read.time));
      result.captures.push_back(std::move(read));
    }
  if (!result.captures.empty()) return;
  add_fault(result, "there are no captures, so all samples are taken as one");
  result.captures.emplace_back();
  headers.push_back(0);
}

/// Where the samples of each capture lie. Headers stand in front of their captures.
void locate(source &result, const std::vector<std::uint64_t> &headers, std::uint64_t data_bytes) {
  const std::uint64_t frame = result.channels * result.format.bytes();
  std::uint64_t before = 0;
  for (std::size_t i = 0; i < result.captures.size(); ++i) {
    capture &now = result.captures[i];
    before += headers[i];
    const std::uint64_t begin = before + now.start * frame;
    if (now.start > data_bytes / frame || begin > data_bytes)
      throw failure("{}: ends before capture {} begins (byte {} of {}); is the file complete?", result.data.string(), i,
                    begin, data_bytes);
    std::uint64_t bytes = data_bytes - begin;
    if (i + 1 < result.captures.size())
      bytes = std::min(bytes, (result.captures[i + 1].start - now.start) * frame);
    else if (bytes % frame != 0)
      throw failure("{}: its {} bytes of samples are no whole number of samples ({} bytes each); is the file complete?",
                    result.data.string(), bytes, frame);
    now.samples = bytes / frame;
    result.extents.push_back({now.start, now.samples, begin});
  }
  result.samples = result.captures.back().start + result.captures.back().samples;
  if (const std::uint64_t first = result.captures.front().start; first > 0)
    add_fault(result, fmt::format("{} samples in front of the first capture belong to none and are left out", first));
  for (std::size_t i = 1; i < result.captures.size(); ++i)
    if (result.captures[i].start == result.captures[i - 1].start)
      add_fault(result, fmt::format("capture {} holds no samples", i - 1));
}

annotation read_annotation(const json &item, const std::string &name) {
  const fields given(item, name);
  annotation read;
  read.start = given.required(given.count("core:sample_start"), "core:sample_start");
  read.samples = given.count("core:sample_count");
  read.low = given.number("core:freq_lower_edge");
  read.high = given.number("core:freq_upper_edge");
  read.label = given.text("core:label").value_or("");
  read.comment = given.text("core:comment").value_or("");
  if (read.low.has_value() != read.high.has_value())
    throw failure("{}: there is one edge of the frequency without the other", name);
  if (read.low && !(*read.low <= *read.high))
    throw failure("{}: core:freq_lower_edge lies above core:freq_upper_edge", name);
  return read;
}

/// What makes no sense is left out and told as a fault.
void read_annotations(source &result) {
  const auto list = result.metadata->find("annotations");
  if (list == result.metadata->end()) return;
  if (!list->is_array()) {
    add_fault(result, "annotations is not a list");
    return;
  }
  for (std::size_t i = 0; i < list->size(); ++i) {
    const std::string name = fmt::format("annotation {}", i);
    try {
      annotation read = read_annotation((*list)[i], name);
      if (read.start < result.first_index) throw failure("{}: starts before core:offset", name);
      read.start -= result.first_index;
      read.item = i;
      if (read.start + read.samples.value_or(0) > result.samples)
        add_fault(result, name + " reaches beyond the last sample");
      result.annotations.push_back(std::move(read));
    } catch (const failure &reason) {
      add_fault(result, fmt::format("{}; it is left out", reason.what()));
    }
  }
}

}  // namespace

std::string dataset_name(const json &metadata, const std::string &usual, const std::string &where) {
  if (!metadata.is_object() || !metadata.contains("global")) throw failure("{}: no SigMF metadata (no global)", where);
  const fields global(metadata["global"], where + ": global");
  if (global.is_true("core:metadata_only"))
    throw failure("{}: holds metadata only, there are no samples to analyse", where);
  const auto dataset = global.text("core:dataset");
  if (!dataset) return usual;
  if (dataset->empty() || dataset->find('\0') != std::string::npos || fs::path(*dataset).has_parent_path() ||
      *dataset == "." || *dataset == "..")
    throw failure("{}: core:dataset must be the name of a file in the same folder", where);
  return *dataset;
}

void describe(source &result, std::shared_ptr<const json> metadata, const std::string &where, std::uint64_t data_bytes,
              const options &said) {
  result.metadata = std::move(metadata);
  const fields global(result.metadata->at("global"), where + ": global");

  const auto type = said.format ? said.format : global.text("core:datatype");
  if (!type) throw failure("{}: core:datatype is missing; say {}", where, said.names.format);
  try {
    result.format = parse_format(*type);
  } catch (const failure &reason) {
    throw failure("{}: {}", where, reason.what());
  }
  result.datatype = result.format.name();
  const auto rate = said.rate ? said.rate : global.number("core:sample_rate");
  if (!rate) throw failure("{}: core:sample_rate is missing; say {} HZ", where, said.names.rate);
  if (!(*rate > 0) || !std::isfinite(*rate))
    throw failure("{}: core:sample_rate {} is not positive; say {} HZ", where, *rate, said.names.rate);
  result.rate = *rate;
  result.channels = global.count("core:num_channels").value_or(1);
  if (result.channels == 0 || result.channels > most_channels)
    throw failure("{}: core:num_channels must be from 1 to {}", where, most_channels);
  try {
    if (!global.text("core:version")) add_fault(result, "core:version is missing");
  } catch (const failure &) {
    add_fault(result, "core:version is not a text");
  }

  const std::uint64_t trailing = global.count("core:trailing_bytes").value_or(0);
  if (trailing > data_bytes) throw failure("{}: shorter than its core:trailing_bytes", result.data.string());
  result.first_index = global.count("core:offset").value_or(0);
  std::vector<std::uint64_t> headers;
  read_captures(result, where, headers);
  locate(result, headers, data_bytes - trailing);
  read_annotations(result);
}

}  // namespace recording
