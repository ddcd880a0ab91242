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

}  // namespace

sigmf_writer::sigmf_writer(const std::filesystem::path &base, const std::vector<std::filesystem::path> &inputs)
    : data_(with_suffix(base, ".sigmf-data"), inputs), meta_(with_suffix(base, ".sigmf-meta"), inputs) {}

void sigmf_writer::write(std::span<const std::complex<float>> samples) {
  data_.write(reinterpret_cast<const char *>(samples.data()), samples.size_bytes());
}

void sigmf_writer::commit(const nlohmann::json &metadata) {
  meta_.print("{}\n", metadata.dump(2, ' ', false, nlohmann::json::error_handler_t::replace));
  data_.commit_with(meta_);
}

}  // namespace tool
