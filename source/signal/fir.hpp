// Filters with a finite response, over streams. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <optional>
#include <span>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/convolution_method.hpp"

namespace dsp {

/// Taps up to which results have the same bits however the stream is cut, unless transforms are asked for.
inline constexpr std::size_t most_exact_taps = 64;
inline constexpr std::size_t most_fir_taps = std::size_t{1} << 24;

/// A stream's latest samples in one piece: `past` of them and a block.
template <class Sample>
class delay_line {
 public:
  delay_line(std::size_t past, std::size_t block)
      : past_(past), end_(past), memory_(past + std::max(past, block) + readable / sizeof(Sample)) {
    clear();
  }

  /// Where the new samples stand, behind `past` older ones. At most a block.
  Sample *append(std::span<const Sample> samples) noexcept {
    if (end_ + samples.size() + readable / sizeof(Sample) > memory_.size()) {
      std::copy_n(memory_.data() + end_ - past_, past_, memory_.data());
      end_ = past_;
    }
    Sample *const first = memory_.data() + end_;
    std::copy(samples.begin(), samples.end(), first);
    end_ += samples.size();
    return first;
  }
  [[nodiscard]] std::span<const Sample> past() const noexcept { return {memory_.data() + end_ - past_, past_}; }
  void set_past(std::span<const Sample> samples) noexcept {
    end_ = past_;
    std::copy(samples.begin(), samples.end(), memory_.data());
  }
  void clear() noexcept {
    end_ = past_;
    std::fill_n(memory_.data(), memory_.size(), Sample{});
  }

 private:
  std::size_t past_, end_;
  qsrfhs::aligned_buffer<Sample> memory_;
};

/// Outputs of a block of samples through transforms.
template <class Sample, class Tap>
class overlap_save {
 public:
  /// At most most_fft_points / 2 taps, and transforms of at least as many points.
  overlap_save(std::span<const Tap> taps, std::size_t length);

  [[nodiscard]] std::size_t length() const noexcept { return transform_.length(); }
  /// New samples that a block takes.
  [[nodiscard]] std::size_t step() const noexcept { return transform_.length() - past_; }

  /// Room for a block: as many samples as there are taps but one, then the new ones.
  [[nodiscard]] std::span<Sample> window() const noexcept { return window_.elements(); }
  /// Filters the window. Returns the outputs of its new samples, valid until the next call.
  Sample *run();

 private:
  using bin = typename block_transform<Sample>::bin;

  std::size_t past_;
  block_transform<Sample> transform_;
  qsrfhs::aligned_buffer<Sample> window_, result_;
  qsrfhs::aligned_buffer<bin> response_, spectrum_;
};

/// The filter out[k] = sum over j of taps[j] * x[k - j]; before the stream's first sample there was silence.
template <class Sample, class Tap>
class fir_filter {
 public:
  /// 1 to most_fir_taps taps. Throws std::bad_alloc, dfti_failure.
  fir_filter(std::span<const Tap> taps, convolution_method method);

  /// As many outputs as samples; `out` may be where the samples are. Throws dfti_failure.
  void process(std::span<const Sample> in, Sample *out);
  void reset() noexcept;

  [[nodiscard]] std::span<const Tap> taps() const noexcept { return taps_.elements(); }
  /// All that the filter remembers: its latest samples, one less than there are taps.
  [[nodiscard]] std::span<const Sample> past() const noexcept { return line_.past(); }
  void set_past(std::span<const Sample> samples) noexcept;

 private:
  /// What a filter by transforms knows of outputs to come.
  ///
  /// A block ends with the samples that there are; the rest of its outputs is what those samples add to outputs to
  /// come. Short calls take that and add directly what the samples since then do, until this would take longer than
  /// the next block.
  struct by_blocks {
    explicit by_blocks(std::span<const Tap> taps);

    overlap_save<Sample, Tap> blocks;
    std::optional<overlap_save<Sample, Tap>> short_blocks;  // for calls that are no longer than the filter
    std::size_t most_recent;                                // samples that are worth adding directly
    qsrfhs::aligned_buffer<Sample> recent;                  // as much silence, then the samples since the block
    std::size_t recent_count = 0;
    const Sample *ahead = nullptr;  // outputs to come
    std::size_t ahead_count = 0;
  };

  void process_block(by_blocks &fourier, std::span<const Sample> in, Sample *out);

  qsrfhs::aligned_buffer<Tap> taps_;
  std::optional<by_blocks> fourier_;
  std::size_t block_;  // samples that are taken at once
  delay_line<Sample> line_;
};

}  // namespace dsp
