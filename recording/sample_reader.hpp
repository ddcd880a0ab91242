// Reads samples in pieces of any size. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <vector>

#include "recording/source.hpp"

namespace recording {

/// Has a file handle and a buffer of its own, so that several threads may each have one, where the source is ranged.
class sample_reader {
 public:
  /// Reads the samples from `first` on, so many or up to the end of an endless input. The source must outlive the
  /// reader. Throws failure.
  sample_reader(const source &from, std::uint64_t first, std::uint64_t samples);
  /// Reads a stretch.
  sample_reader(const source &from, const stretch &over) : sample_reader(from, over.first, over.samples) {}

  /// Gives the next samples and how many they are: fewer than there is room for only at the end. Real samples become
  /// complex ones with Q = 0. Throws failure when the file fails, is shorter than it was, or ends inside of a sample,
  /// and when a sample is not a finite number in the precision asked for.
  std::size_t read(std::span<std::complex<float>> out);
  std::size_t read(std::span<std::complex<double>> out);
  /// The same for real samples; the source must not have complex ones.
  std::size_t read(std::span<float> out);
  std::size_t read(std::span<double> out);

  /// The next sample that read gives, from the first one on.
  [[nodiscard]] std::uint64_t position() const noexcept { return position_; }
  /// Goes on at this position, not beyond the samples. A source that is not ranged takes later positions alone.
  void seek(std::uint64_t position) noexcept { position_ = position; }

  /// From now on counts the samples read that have a part at an end of their integer type.
  void count_clipped() noexcept { counting_ = true; }
  [[nodiscard]] std::uint64_t clipped() const noexcept { return clipped_; }

 private:
  template <class Real>
  std::size_t read_components(std::span<Real> out);
  template <class Real>
  std::size_t read_complex(std::span<std::complex<Real>> out);
  /// Reads one extent's samples, not more than fit in the buffer.
  template <class Real>
  std::size_t read_piece(std::span<Real> out);
  template <class Real>
  void require_finite(std::span<const Real> components) const;

  const source &source_;
  std::uint64_t first_, samples_, position_ = 0;
  std::size_t frame_;  // bytes of one sample of all channels
  std::unique_ptr<byte_reader> reader_;
  std::vector<std::byte> bytes_;
  bool counting_ = false;
  std::uint64_t clipped_ = 0;
};

}  // namespace recording
