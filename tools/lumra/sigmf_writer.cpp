// SPDX-License-Identifier: MIT
#include "sigmf_writer.hpp"

#include <bit>
#include <nlohmann/json.hpp>

namespace tool {
namespace {

static_assert(std::endian::native == std::endian::little, "samples are written as they lie in memory");

std::filesystem::path with_suffix(std::filesystem::path base, const char *suffix) {
  return base += suffix;
}

std::string text_of(const nlohmann::json &value) {
  return value.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace);
}

}  // namespace

sigmf_writer::sigmf_writer(results &among, const std::filesystem::path &base)
    : data_(among.add_file(with_suffix(base, ".sigmf-data"))),
      meta_(among.add_file(with_suffix(base, ".sigmf-meta"))) {}

void sigmf_writer::write(std::span<const std::complex<float>> samples) {
  data_.write(reinterpret_cast<const char *>(samples.data()), samples.size_bytes());
}

void sigmf_writer::write(const nlohmann::json &metadata) {
  const char *before = "{";
  for (const auto &[name, part] : metadata.items()) {
    meta_.print("{}\n  {}: {}", before, text_of(name), part.is_object() ? "{" : "[");
    before = "";
    for (const auto &item : part.items()) {
      const std::string key = part.is_object() ? text_of(item.key()) + ": " : "";
      meta_.print("{}\n    {}{}", before, key, text_of(item.value()));
      before = ",";
    }
    meta_.print("{}{}", part.empty() ? "" : "\n  ", part.is_object() ? "}" : "]");
    before = ",";
  }
  meta_.print("\n}}\n");
}

}  // namespace tool
