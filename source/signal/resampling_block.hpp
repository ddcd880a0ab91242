// Rate changes by a fraction of small integers, through Fourier transforms of blocks. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <complex>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/dfti_descriptor.hpp"
#include "signal/sample_type.hpp"

namespace dsp {

/// A low pass in cycles per input sample.
struct lowpass_band {
  double pass;         // the last frequency that is kept
  double stop;         // the first that is rejected, at most half of the lower rate
  double attenuation;  // in dB
};

/// Blocks of inputs, each with the outputs that it gives. A unit is `down` inputs or `up` outputs, the time after which
/// both rates meet again: blocks follow one another by whole units, so that positions are integers.
struct block_design {
  std::size_t up, down;  // in lowest terms
  std::size_t units;     // of the transforms, which have `inputs` points forward and `outputs` backward
  std::size_t step;      // units from a block to the next
  std::size_t guard;     // inputs of a block in front of its first output, which reach it
  lowpass_band band;
  double cost;  // nanoseconds for an input sample, on the processor that costs were measured on

  [[nodiscard]] std::size_t inputs() const noexcept { return units * down; }
  [[nodiscard]] std::size_t outputs() const noexcept { return units * up; }
};

/// The longest transforms of blocks: longer ones leave the second-level cache.
inline constexpr std::size_t longest_resampling_block = std::size_t{1} << 16;

/// The design with the shortest blocks whose cost is near the lowest, or at most `spare` nanoseconds above it; none
/// where blocks would be too long.
[[nodiscard]] std::optional<block_design> design_block(std::size_t up, std::size_t down, const lowpass_band &band,
                                                       double spare);

/// The response of a design's low pass, scaled for its transforms and with the guard's delay taken out: at the bins
/// from 0 up to the stop edge, then for complex samples at those from the lowest one to -1. Throws std::bad_alloc,
/// dfti_failure.
template <class Sample>
[[nodiscard]] qsrfhs::aligned_buffer<std::complex<real_of<Sample>>> make_response(const block_design &design);

/// A stream through blocks. Output j lies at j down / up inputs. Positions are negative in front of the stream's first
/// sample, where a filter without delay has outputs, too.
template <class Sample>
class block_resampler {
 public:
  using bin = std::complex<real_of<Sample>>;
  using response = std::shared_ptr<const qsrfhs::aligned_buffer<bin>>;

  /// In front of `first_input` there was silence. Outputs begin `lead` units in front of position 0. Throws
  /// std::bad_alloc, dfti_failure.
  block_resampler(const block_design &design, response kept, std::int64_t first_input, std::size_t lead);

  /// Units in front of position 0 in which inputs from `first_input` on have outputs.
  [[nodiscard]] static std::size_t lead_of(const block_design &design, std::int64_t first_input) noexcept;

  [[nodiscard]] const block_design &design() const noexcept { return design_; }
  /// Where the outputs end that inputs up to `end` have given.
  [[nodiscard]] std::int64_t outputs_end(std::int64_t end) const noexcept;
  /// Where the outputs end that inputs up to `end` reach.
  [[nodiscard]] std::int64_t reach(std::int64_t end) const noexcept;

  /// Takes the stream's next samples and calls sink(span) with the outputs of each block. Throws dfti_failure.
  template <class Sink>
  void feed(std::span<const Sample> in, Sink sink) {
    const std::size_t early = std::min(early_, in.size());
    early_ -= early;
    in = in.subspan(early);
    while (held_ + in.size() >= design_.inputs()) {
      const std::size_t fresh = design_.inputs() - held_;
      const auto outputs = run(in.first(fresh));
      in = in.subspan(fresh);
      sink(outputs);
    }
    std::copy(in.begin(), in.end(), line_.data() + held_);
    held_ += in.size();
  }
  void reset() noexcept;

  /// All that is remembered.
  [[nodiscard]] std::span<const Sample> held() const noexcept { return line_.elements().first(held_); }
  /// Room for what is remembered once inputs have come up to `end`.
  [[nodiscard]] std::span<Sample> restore(std::int64_t end) noexcept;

 private:
  /// Blocks that inputs up to `end` complete.
  [[nodiscard]] std::int64_t blocks(std::int64_t end) const noexcept;
  /// The block of what is held and these samples.
  std::span<const Sample> run(std::span<const Sample> fresh);

  block_design design_;
  response response_;
  std::int64_t first_input_;
  std::int64_t origin_;        // where the first block begins
  std::int64_t first_output_;  // and its outputs
  dfti_descriptor forward_, backward_;
  qsrfhs::aligned_buffer<bin> work_;
  qsrfhs::aligned_buffer<Sample> line_;  // the samples of an incomplete block
  std::size_t held_ = 0;                 // of them
  std::size_t early_ = 0;                // inputs to come that no output needs
};

}  // namespace dsp
