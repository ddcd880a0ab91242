// Reads a recording from front to back in pieces of any size. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "recording/file.hpp"
#include "recording/source.hpp"

namespace recording {

class sample_reader {
 public:
  /// The source must outlive the reader. Throws failure.
  explicit sample_reader(const source &from);

  /// Fills out with the next samples, across extents. Throws failure when the file fails or ends, and when a sample is
  /// not a finite number in single precision.
  void read(std::span<std::complex<float>> out);

 private:
  void read_piece(std::span<std::complex<float>> out, std::uint64_t offset);

  const source &source_;
  descriptor file_;
  std::size_t extent_ = 0;        // the one being read
  std::uint64_t in_extent_ = 0;   // samples of it that were read
  std::uint64_t position_ = 0;    // samples that were read
  std::vector<std::byte> bytes_;  // as they lie in the file
};

}  // namespace recording
