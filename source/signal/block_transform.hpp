// Fourier transforms of blocks that are filtered. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>

#include "signal/dfti_descriptor.hpp"
#include "signal/sample_type.hpp"

namespace dsp {

/// Transforms of one length, out of place and unscaled; those of real samples have the non-negative half of the bins.
/// Making one takes as long as several of its transforms, so that a few short ones are kept for whoever is next. One
/// thread at a time. All throw dfti_failure.
template <class Sample>
class block_transform {
 public:
  using bin = std::complex<real_of<Sample>>;

  /// 1 to most_fft_points points.
  explicit block_transform(std::size_t length);
  block_transform(const block_transform &) = delete;
  block_transform &operator=(const block_transform &) = delete;
  ~block_transform();

  [[nodiscard]] std::size_t length() const noexcept { return length_; }
  [[nodiscard]] std::size_t bins() const noexcept { return is_complex<Sample> ? length_ : length_ / 2 + 1; }

  void forward(const Sample *in, bin *out) const { descriptor_.forward(in, out); }
  void backward(const bin *in, Sample *out) const { descriptor_.backward(in, out); }

 private:
  std::size_t length_;
  dfti_descriptor descriptor_;
};

}  // namespace dsp
