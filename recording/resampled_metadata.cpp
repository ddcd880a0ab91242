// SPDX-License-Identifier: MIT
#include "recording/resampled_metadata.hpp"

#include <algorithm>
#include <cmath>

#include "recording/metadata_fields.hpp"

namespace recording {
namespace {

using nlohmann::json;

/// These fields speak of the file that was read, its samples or its place among others; the new indices start at 0.
constexpr const char *no_longer_true[] = {
    "core:sha512",        "core:dataset",        "core:data_doi", "core:meta_doi",
    "core:metadata_only", "core:trailing_bytes", "core:offset",   "core:collection",
};

/// Maps indices of the source's metadata to those of the result.
struct index_map {
  std::uint64_t first, end;  // what the result covers
  double ratio;
  std::uint64_t samples;

  [[nodiscard]] std::uint64_t operator()(std::uint64_t index) const {
    const auto offset = static_cast<double>(std::clamp(index, first, end) - first);
    return std::min(static_cast<std::uint64_t>(std::llround(offset / ratio)), samples);
  }
};

const json &list_of(const source &from, const char *name) {
  static const json none = json::array();
  const auto list = from.metadata->find(name);
  if (list == from.metadata->end()) return none;
  if (!list->is_array()) throw failure("{}: {} must be a list", from.files.front().string(), name);
  return *list;
}

json captures_of(const source &from, const index_map &map) {
  json captures = json::array({{{"core:sample_start", 0}}});
  for (json capture : list_of(from, "captures")) {
    const std::uint64_t start = fields(capture, "captures").count("core:sample_start").value_or(0);
    if (start < map.first || start >= map.end) continue;
    capture["core:sample_start"] = std::min(map(start), map.samples - 1);
    for (const char *field : {"core:header_bytes", "core:global_index"}) capture.erase(field);
    if (capture["core:sample_start"] == captures.back()["core:sample_start"])
      captures.back().update(capture);
    else
      captures.push_back(std::move(capture));
  }
  return captures;
}

json annotations_of(const source &from, const index_map &map) {
  json annotations = json::array();
  std::size_t number = 0;
  for (json annotation : list_of(from, "annotations")) {
    const fields given(annotation, fmt::format("{}: annotation {}", from.files.front().string(), number++));
    const std::uint64_t start = given.count("core:sample_start").value_or(0);
    const auto count = given.count("core:sample_count");
    const bool ends_before = start < map.first && start + count.value_or(0) <= map.first;
    if (ends_before || start >= map.end) continue;
    const std::uint64_t at = std::min(map(start), map.samples - 1);
    annotation["core:sample_start"] = at;
    if (count) annotation["core:sample_count"] = std::max<std::uint64_t>(map(start + *count), at + 1) - at;
    annotations.push_back(std::move(annotation));
  }
  return annotations;
}

}  // namespace

json resampled_metadata(const source &from, double ratio, double rate, std::uint64_t samples, const std::string &text) {
  json global = json::object(), captures = json::array({{{"core:sample_start", 0}}}), annotations = json::array();
  std::string description = from.name;
  if (from.metadata) {
    const index_map map{from.first_index, from.first_index + from.samples(), ratio, samples};
    global = from.metadata->at("global");
    description = fields(global, from.files.front().string()).text("core:description").value_or(description);
    for (const char *field : no_longer_true) global.erase(field);
    captures = captures_of(from, map);
    annotations = annotations_of(from, map);
  }
  global["core:datatype"] = "cf32_le";
  global["core:sample_rate"] = rate;
  global["core:version"] = "1.2.0";
  global["core:description"] = description + ", " + text;
  json result;
  result["global"] = std::move(global);
  result["captures"] = std::move(captures);
  result["annotations"] = std::move(annotations);
  return result;
}

}  // namespace recording
