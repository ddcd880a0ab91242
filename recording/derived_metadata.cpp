// SPDX-License-Identifier: MIT
#include "recording/derived_metadata.hpp"

#include <algorithm>
#include <cmath>
#include <iterator>
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

/// Samples [first, end) of the source.
struct range {
  std::uint64_t first, end;
  range(std::uint64_t begin, std::uint64_t samples) : first(begin), end(begin + std::min(samples, endless - begin)) {}
};

/// Maps indices of the source's samples to those of the result.
class index_map {
 public:
  index_map(const source &from, const derivation &made) : pieces_(made.pieces), factor_(made.rate / from.rate) {}

  [[nodiscard]] std::uint64_t samples() const noexcept { return pieces_.back().at + pieces_.back().samples; }
  /// The first piece that holds samples of a range; null where none does.
  [[nodiscard]] const derived_piece *piece_of(const range &sought) const {
    const auto piece = ends_behind(sought.first);
    return piece != pieces_.end() && sought.end > piece->first ? &*piece : nullptr;
  }
  /// Indices between pieces are those of the next piece's first sample.
  [[nodiscard]] std::uint64_t operator()(std::uint64_t index) const {
    const auto piece = ends_behind(index);
    if (piece == pieces_.end()) return samples();
    return index < piece->first ? piece->at : piece->at + offset(*piece, index - piece->first);
  }
  /// Of a first sample: it is there even where nothing is behind it.
  [[nodiscard]] std::uint64_t first(std::uint64_t index) const {
    return std::min((*this)(index), std::max<std::uint64_t>(samples(), 1) - 1);
  }

 private:
  /// The first piece with samples behind an index, or at it.
  [[nodiscard]] std::vector<derived_piece>::const_iterator ends_behind(std::uint64_t index) const {
    return std::partition_point(pieces_.begin(), pieces_.end(), [index](const derived_piece &piece) {
      return piece.first + piece.samples_in <= index;
    });
  }
  [[nodiscard]] std::uint64_t offset(const derived_piece &piece, std::uint64_t inputs) const {
    if (factor_ == 1) return std::min(inputs, piece.samples);  // exact beyond 2^53, too
    const double outputs = std::round(static_cast<double>(inputs) * factor_), most = static_cast<double>(piece.samples);
    return outputs < most ? static_cast<std::uint64_t>(outputs) : piece.samples;
  }

  const std::vector<derived_piece> &pieces_;
  double factor_;
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
    const derived_piece *const piece = each.samples == 0 ? nullptr : map.piece_of({each.start, each.samples});
    if (!piece) continue;
    json item = item_of(from, "captures", i);
    for (const char *field : {"core:header_bytes", "core:global_index"}) item.erase(field);
    const std::uint64_t at = map.first(std::max(each.start, piece->first));
    item["core:sample_start"] = at;
    if (each.start < piece->first) {
      item.erase("core:datetime");
      if (each.begin)
        item["core:datetime"] =
            text_of(later(*each.begin, static_cast<long double>(piece->first - each.start) / from.rate));
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

/// The source's centre at a sample, where it is known.
double frequency_at(const source &from, std::uint64_t index) {
  const auto behind = std::partition_point(from.captures.begin(), from.captures.end(),
                                           [index](const capture &each) { return each.start <= index; });
  return behind == from.captures.begin() ? 0 : std::prev(behind)->frequency.value_or(0);
}

/// Cuts an annotation's frequencies to a band; false where none are left.
bool cut_to_band(json &item, const annotation &each, double low, double high) {
  if (!each.low || !each.high) return true;
  if (*each.high <= low || *each.low >= high) return false;
  if (*each.low < low) item["core:freq_lower_edge"] = low;
  if (*each.high > high) item["core:freq_upper_edge"] = high;
  return true;
}

json annotations_of(const source &from, const derivation &made, const index_map &map) {
  const bool keeps_band = made.rate == from.rate && !made.frequency;
  json annotations = json::array();
  for (const annotation &each : from.annotations) {
    const range where(each.start, std::max<std::uint64_t>(each.samples.value_or(1), 1));
    const derived_piece *const piece = map.piece_of(where);
    if (!piece) continue;
    json item = item_of(from, "annotations", each.item);
    const std::uint64_t first = std::max(where.first, piece->first), at = map.first(first);
    const double centre = made.frequency.value_or(frequency_at(from, first));
    if (!keeps_band && !cut_to_band(item, each, centre - made.rate / 2, centre + made.rate / 2)) continue;
    item["core:sample_start"] = at;
    if (each.samples) item["core:sample_count"] = std::max<std::uint64_t>(map(where.end), at + 1) - at;
    annotations.push_back(std::move(item));
  }
  return annotations;
}

}  // namespace

json derived_metadata(const source &from, const derivation &made) {
  const index_map map(from, made);
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
