// Streams at other rates. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <vector>

#include "signal/interpolator.hpp"
#include "signal/rate_ratio.hpp"
#include "signal/resampling_block.hpp"
#include "signal/resampling_plan.hpp"

namespace dsp {

/// What streams of one change of rates share.
template <class Sample>
struct rate_change {
  /// Pass band as a fraction of half the lower rate, rejection in dB. Throws std::bad_alloc, dfti_failure.
  rate_change(const rate_ratio &output_to_input, double passband, double rejection);

  rate_ratio ratio;
  resampling_plan plan;
  std::vector<typename block_resampler<Sample>::response> responses;  // of the plan's blocks
};

/// A stream at another rate: output k lies at the place k down / up of the input, exactly, and n inputs give
/// ceil(n up / down) outputs until the stream is flushed. The same bits for any cut of the stream.
template <class Sample>
class resampler {
 public:
  /// Throws std::bad_alloc, dfti_failure.
  explicit resampler(std::shared_ptr<const rate_change<Sample>> change);

  /// Inputs since the stream's beginning.
  [[nodiscard]] std::uint64_t inputs() const noexcept { return inputs_; }
  /// Outputs that the first n inputs give without a flush.
  [[nodiscard]] std::uint64_t outputs(std::uint64_t n) const noexcept;
  /// Those that the next n inputs give.
  [[nodiscard]] std::uint64_t next_outputs(std::uint64_t n) const noexcept {
    return outputs(inputs_ + n) - outputs(inputs_);
  }
  [[nodiscard]] std::uint64_t flushed_outputs() const noexcept {
    return static_cast<std::uint64_t>(change_->ratio.outputs(inputs_)) - outputs(inputs_);
  }
  /// The most inputs that outputs lag behind, rounded up.
  [[nodiscard]] std::uint64_t latency() const noexcept;

  /// Takes the stream's next samples; `out` has as many elements as they give. Throws dfti_failure, and must then be
  /// reset.
  void process(std::span<const Sample> in, std::span<Sample> out);
  /// Ends the stream and begins a new one; `out` has flushed_outputs elements. Throws dfti_failure.
  void flush(std::span<Sample> out);
  void reset() noexcept;

  /// Gives all that is remembered to `to`.
  template <class Writer>
  void save(Writer &to) const {
    to.add(inputs_);
    for (const auto &block : blocks_) to.add_all(block.held());
    if (interpolator_) to.add_all(std::span<const Sample>(interpolator_->past()));
  }
  /// Takes that from `from`; false where it cannot be.
  template <class Reader>
  [[nodiscard]] bool load(Reader &from);

 private:
  /// Samples behind block `k`, or into the first for 0.
  void pass(std::size_t k, std::span<const Sample> x);
  void deliver(std::span<const Sample> x);
  /// Samples in front of the interpolator's first.
  void precede(std::span<const Sample> x) noexcept;
  /// Where outputs of the blocks end that the first n inputs give.
  [[nodiscard]] std::int64_t blocks_end(std::uint64_t n) const noexcept;

  std::shared_ptr<const rate_change<Sample>> change_;
  std::vector<block_resampler<Sample>> blocks_;
  std::optional<interpolator<Sample>> interpolator_;
  qsrfhs::aligned_buffer<Sample> past_;  // room for what the interpolator remembers
  std::size_t early_ = 0;                // samples to come in front of its first
  std::uint64_t inputs_ = 0;
  std::span<Sample> out_;  // what is still to be written in a call
};

/// The furthest that streams go, in inputs and in outputs.
inline constexpr std::uint64_t longest_resampled = std::uint64_t{1} << 60;

template <class Sample>
template <class Reader>
bool resampler<Sample>::load(Reader &from) {
  inputs_ = from.template take<std::uint64_t>();
  if (inputs_ > longest_resampled || change_->ratio.outputs(inputs_) > longest_resampled) return false;
  auto end = static_cast<std::int64_t>(inputs_);
  for (auto &block : blocks_) {
    from.take_all(block.restore(end));
    end = block.outputs_end(end);
  }
  if (!interpolator_) return true;
  from.take_all(past_.elements());
  early_ = end < 0 ? static_cast<std::size_t>(-end) : 0;
  interpolator_->set_past(end < 0 ? 0 : static_cast<std::uint64_t>(end), past_.elements());
  return true;
}

}  // namespace dsp
