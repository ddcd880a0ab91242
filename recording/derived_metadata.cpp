// SPDX-License-Identifier: MIT
#include "recording/derived_metadata.hpp"

#include <algorithm>
#include <cmath>
#include <nlohmann/json.hpp>

#include "recording/metadata_fields.hpp"

namespace recording {
namespace {

using nlohmann::json;

/// These fields speak of the file that was read, its samples or its place among others; the new indices start at 0.
constexpr const char *no_longer_true[] = {
    "core:sha512",        "core:dataset",        "core:data_doi", "core:meta_doi",   "core:num_channels",
    "core:metadata_only", "core:trailing_bytes", "core:offset",   "core:collection",
};

/// Maps indices of the source's samples to those of the result.
struct index_map {
  const derivation &made;

  [[nodiscard]] std::uint64_t end() const noexcept { return made.first + made.samples_in; }
  [[nodiscard]] std::uint64_t operator()(std::uint64_t index) const {
    const std::uint64_t offset = std::clamp(index, made.first, end()) - made.first;
    if (made.ratio == 1) return std::min(offset, made.samples);  // exact beyond 2^53, too
    return std::min(static_cast<std::uint64_t>(std::llround(static_cast<double>(offset) / made.ratio)), made.samples);
  }
};

/// The item of a list of the source's metadata, or an empty object.
json item_of(const source &from, const char *list, std::size_t index) {
  if (!from.metadata) return json::object();
  const auto found = from.metadata->find(list);
  return found != from.metadata->end() && index < found->size() ? (*found)[index] : json::object();
}

json captures_of(const source &from, const derivation &made, const index_map &map) {
  json captures = json::array();
  for (std::size_t i = 0; i < from.captures.size(); ++i) {
    const capture &each = from.captures[i];
    if (each.samples == 0 || each.start >= map.end() || each.samples <= made.first - std::min(made.first, each.start))
      continue;
    json item = item_of(from, "captures", i);
    for (const char *field : {"core:header_bytes", "core:global_index"}) item.erase(field);
    const std::uint64_t at = std::min(map(each.start), std::max<std::uint64_t>(made.samples, 1) - 1);
    item["core:sample_start"] = at;
    if (each.start < made.first) {
      item.erase("core:datetime");
      if (each.begin)
        item["core:datetime"] =
            text_of(later(*each.begin, static_cast<long double>(made.first - each.start) / from.rate));
    }
    const std::optional<double> frequency = made.frequency ? made.frequency : each.frequency;
    if (frequency)
      item["core:frequency"] = *frequency;
    else
      item.erase("core:frequency");
    if (!captures.empty() && captures.back()["core:sample_start"] == at)
      captures.back() = std::move(item);
    else
      captures.push_back(std::move(item));
  }
  if (captures.empty()) captures.push_back({{"core:sample_start", 0}});
  return captures;
}

json annotations_of(const source &from, const derivation &made, const index_map &map) {
  json annotations = json::array();
  for (const annotation &each : from.annotations) {
    const bool ends_before = each.start < made.first && each.start + each.samples.value_or(0) <= made.first;
    if (ends_before || each.start >= map.end()) continue;
    json item = item_of(from, "annotations", each.item);
    const std::uint64_t at = std::min(map(each.start), std::max<std::uint64_t>(made.samples, 1) - 1);
    item["core:sample_start"] = at;
    if (each.samples) item["core:sample_count"] = std::max<std::uint64_t>(map(each.start + *each.samples), at + 1) - at;
    annotations.push_back(std::move(item));
  }
  return annotations;
}

}  // namespace

json derived_metadata(const source &from, const derivation &made) {
  const index_map map{made};
  json global = json::object();
  std::string description = from.name;
  if (from.metadata) {
    global = from.metadata->at("global");
    if (const auto text = global.find("core:description"); text != global.end() && text->is_string())
      description = text->get<std::string>();
    for (const char *field : no_longer_true) global.erase(field);
  }
  global["core:datatype"] = made.datatype;
  global["core:sample_rate"] = made.rate;
  global["core:version"] = "1.2.0";
  global["core:description"] = made.description.empty() ? description : description + ", " + made.description;
  json result;
  result["global"] = std::move(global);
  result["captures"] = captures_of(from, made, map);
  result["annotations"] = annotations_of(from, made, map);
  return result;
}

}  // namespace recording
