// SPDX-License-Identifier: MIT
#include "sigmf_writer.hpp"

#include <bit>
#include <cerrno>
#include <nlohmann/json.hpp>
#include <system_error>

#include "failure.hpp"

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

void sigmf_writer::commit(double rate, std::optional<double> frequency, const std::string &description) {
  using nlohmann::json;
  json capture{{"core:sample_start", 0}};
  if (frequency) capture["core:frequency"] = *frequency;
  const json root{{"global",
                   {{"core:datatype", "cf32_le"},
                    {"core:sample_rate", rate},
                    {"core:version", "1.2.0"},
                    {"core:description", description}}},
                  {"captures", json::array({capture})},
                  {"annotations", json::array()}};
  meta_.print("{}\n", root.dump(2, ' ', false, json::error_handler_t::replace));
  // Before the data appear, so that a full disk leaves neither.
  if (std::fflush(meta_.stream()) != 0)
    throw failure("cannot write the metadata: {}", std::generic_category().message(errno));
  data_.commit();
  meta_.commit();
}

}  // namespace tool
