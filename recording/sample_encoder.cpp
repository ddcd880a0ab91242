// SPDX-License-Identifier: MIT
#include "recording/sample_encoder.hpp"

#include <bit>

#include "recording/sample_codec.hpp"

namespace recording {

static_assert(std::endian::native == std::endian::little, "single precision is written as it lies in memory");

void sample_encoder::write(std::span<const std::complex<float>> samples) {
  if (format_.type == component::f32 && !format_.big_endian) {
    to_.write(std::as_bytes(samples));
    return;
  }
  const auto *const parts = reinterpret_cast<const float *>(samples.data());
  wide_.assign(parts, parts + 2 * samples.size());
  write_components(wide_);
}

void sample_encoder::write(std::span<const std::complex<double>> samples) {
  write_components({reinterpret_cast<const double *>(samples.data()), 2 * samples.size()});
}

void sample_encoder::write_components(std::span<const double> components) {
  bytes_.resize(components.size() / format_.components() * format_.bytes());
  clipped_ += encode(format_, components, bytes_);
  to_.write(bytes_);
}

}  // namespace recording
