// SPDX-License-Identifier: MIT
#include "commands/sigmf_result.hpp"

#include <algorithm>
#include <cmath>
#include <nlohmann/json.hpp>

#include "terminal/failure.hpp"

namespace tool {

namespace fs = std::filesystem;

fs::path result_base(fs::path said) {
  if (said.extension() == ".sigmf-data" || said.extension() == ".sigmf-meta") said.replace_extension();
  if (!said.has_filename()) throw failure("{}: is a folder; give the result a name in it", said.string());
  return said;
}

recording::sample_format result_format(const recording::source &source, const std::string &datatype,
                                       recording::sample_format usual) {
  if (usual.type == recording::component::i24) usual.type = recording::component::i32;
  const recording::sample_format format = datatype.empty() ? usual : recording::parse_format(datatype);
  if (source.format.is_complex && !format.is_complex)
    throw failure("{}: its samples are complex, of which {} would keep a half; use a type that begins with c",
                  source.data.string(), datatype);
  return format;
}

void write_metadata(output_file &file, const nlohmann::json &metadata) {
  const std::string text = recording::metadata_text(metadata);
  file.write(std::as_bytes(std::span(text)));
}

sigmf_result::sigmf_result(results &given, const recording::source &from, const fs::path &base,
                           const recording::sample_format &format)
    : source_(from.data),
      files_(recording::sigmf_files_of(base)),
      format_(format),
      data_(given.add_file(files_.data)),
      metadata_(given.add_file(files_.metadata)),
      encoder_(data_, format_) {}

void sigmf_result::require_finite(std::span<const float> parts) const {
  if (!std::all_of(parts.begin(), parts.end(), [](float x) { return std::isfinite(x); }))
    throw failure("{}: samples are too large for single precision; scale the recording down", source_.string());
}

void sigmf_result::write(std::span<const std::complex<float>> samples) {
  require_finite({reinterpret_cast<const float *>(samples.data()), 2 * samples.size()});
  encoder_.write(samples);
  samples_ += samples.size();
}

void sigmf_result::write(std::span<const float> samples) {
  if (format_.is_complex) {
    complex_.assign(samples.begin(), samples.end());
    return write(std::span<const std::complex<float>>(complex_));
  }
  require_finite(samples);
  wide_.assign(samples.begin(), samples.end());
  encoder_.write(std::span<const double>(wide_));
  samples_ += samples.size();
}

}  // namespace tool
