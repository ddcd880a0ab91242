// SPDX-License-Identifier: MIT
#include "recording/sigmf_writer.hpp"

#include <fmt/format.h>

#include <bit>
#include <iterator>
#include <nlohmann/json.hpp>

namespace recording {
namespace {

static_assert(std::endian::native == std::endian::little, "samples are written as they lie in memory");

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

void sigmf_writer::write(std::span<const std::complex<float>> samples) {
  data_.write(std::as_bytes(samples));
}

void sigmf_writer::write(const nlohmann::json &metadata) {
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
  metadata_.write(std::as_bytes(std::span(text)));
}

}  // namespace recording
