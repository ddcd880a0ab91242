// Samples to the bytes of a type. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstdint>
#include <span>
#include <vector>

#include "recording/byte_sink.hpp"
#include "recording/sample_format.hpp"

namespace recording {

class sample_encoder {
 public:
  /// The sink outlives the encoder.
  sample_encoder(byte_sink &to, const sample_format &format) noexcept : to_(to), format_(format) {}

  /// Appends samples, of a complex type; those beyond its full scale are limited to it and counted.
  void write(std::span<const std::complex<float>> samples);
  void write(std::span<const std::complex<double>> samples);
  /// The same for a real type.
  void write(std::span<const double> samples) { write_components(samples); }

  /// How many samples had a part that was limited.
  [[nodiscard]] std::uint64_t clipped() const noexcept { return clipped_; }

 private:
  void write_components(std::span<const double> components);

  byte_sink &to_;
  sample_format format_;
  std::uint64_t clipped_ = 0;
  std::vector<double> wide_;
  std::vector<std::byte> bytes_;
};

}  // namespace recording
