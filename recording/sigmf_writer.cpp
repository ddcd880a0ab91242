// SPDX-License-Identifier: MIT
#include "recording/sigmf_writer.hpp"

#include <fmt/format.h>

#include <iterator>
#include <nlohmann/json.hpp>

namespace recording {
namespace {

std::filesystem::path with_suffix(std::filesystem::path base, const char *suffix) {
  return base += suffix;
}

std::string text_of(const nlohmann::json &value) {
  return value.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace);
}

}  // namespace

sigmf_files sigmf_files_of(const std::filesystem::path &base) {
  return {with_suffix(base, ".sigmf-data"), with_suffix(base, ".sigmf-meta")};
}

std::string metadata_text(const nlohmann::json &metadata) {
  std::string text;
  const auto to = std::back_inserter(text);
  const char *before = "{";
  for (const auto &[name, part] : metadata.items()) {
    fmt::format_to(to, "{}\n  {}: {}", before, text_of(name), part.is_object() ? "{" : "[");
    before = "";
    for (const auto &item : part.items()) {
      const std::string key = part.is_object() ? text_of(item.key()) + ": " : "";
      fmt::format_to(to, "{}\n    {}{}", before, key, text_of(item.value()));
      before = ",";
    }
    fmt::format_to(to, "{}{}", part.empty() ? "" : "\n  ", part.is_object() ? "}" : "]");
    before = ",";
  }
  text += "\n}\n";
  return text;
}

}  // namespace recording
