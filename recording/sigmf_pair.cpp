// SPDX-License-Identifier: MIT
#include "recording/sigmf_pair.hpp"

#include <nlohmann/json.hpp>

#include "recording/failure.hpp"
#include "recording/file.hpp"
#include "recording/metadata_text.hpp"
#include "recording/sigmf_metadata.hpp"

namespace recording {
namespace {

namespace fs = std::filesystem;

source open_described(const fs::path &meta, const options &said) {
  auto metadata = std::make_shared<const nlohmann::json>(read_metadata(meta));
  source result;
  result.name = meta.stem().string();
  result.data = meta.parent_path() / dataset_name(*metadata, result.name + ".sigmf-data", meta.string());
  result.files = {meta, result.data};
  describe(result, std::move(metadata), meta.string(), readable_size(result.data), said);
  result.bytes = [data = result.data] { return read_file(data); };
  return result;
}

}  // namespace

std::optional<source> open_sigmf_pair(const fs::path &path, const options &said) {
  const fs::path suffix = path.extension();
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
