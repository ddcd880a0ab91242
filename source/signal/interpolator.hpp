// Samples between samples, at any ratio of rates, of streams that leave half of their band empty.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/fir.hpp"
#include "signal/rate_ratio.hpp"

namespace dsp {

/// Output k lies at k down / up input samples, for ever; before the stream's first sample there was silence. Signals
/// within a quarter of the input's rate keep their level, and their images are rejected; outputs whose rate is lower
/// than the signal's band fold it. The same bits for any cut of the stream. No memory is taken after construction.
///
/// A short filter by Kaiser's window, whose taps are pieces of cubic polynomials in the place between two samples.
template <class Sample>
class interpolator {
 public:
  /// Rejection in dB, 20 to 150. Throws std::bad_alloc.
  interpolator(const rate_ratio &ratio, double rejection);

  [[nodiscard]] const rate_ratio &ratio() const noexcept { return ratio_; }
  /// Inputs behind an output's place that it needs.
  [[nodiscard]] std::size_t latency() const noexcept { return taps_ / 2; }
  [[nodiscard]] std::uint64_t inputs() const noexcept { return inputs_; }
  /// Outputs that the first n inputs of the stream give.
  [[nodiscard]] wide_unsigned outputs(std::uint64_t n) const noexcept {
    return n > latency() ? ratio_.outputs(n - latency()) : 0;
  }
  /// Outputs that n more inputs give.
  [[nodiscard]] wide_unsigned next_outputs(std::uint64_t n) const noexcept {
    return outputs(inputs_ + n) - outputs(inputs_);
  }

  /// Takes the stream's next samples and writes as many outputs as there is room for: next_outputs, or fewer where the
  /// stream's end is known, behind which there is reset only.
  void process(std::span<const Sample> in, std::span<Sample> out) noexcept;
  void reset() noexcept;

  // All that is remembered: how many inputs there were, and the latest of them.
  [[nodiscard]] std::span<const Sample> past() const noexcept { return line_.past(); }
  void set_past(std::uint64_t inputs, std::span<const Sample> samples) noexcept;

 private:
  using real = real_of<Sample>;

  rate_ratio ratio_;
  std::size_t taps_, pieces_;
  qsrfhs::aligned_buffer<real> coefficients_;
  delay_line<Sample> line_;
  std::uint64_t inputs_ = 0;
  stream_position next_{0, 0};  // of the next output
};

}  // namespace dsp
