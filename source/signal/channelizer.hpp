// Many channels out of one wideband stream. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <vector>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/block_transform.hpp"
#include "signal/channel_plan.hpp"
#include "signal/dfti_descriptor.hpp"
#include "signal/radix_pass.hpp"
#include "signal/sample_type.hpp"

namespace dsp {

/// Sample j of a channel lies at j / ratio samples of the stream: the stream, filtered around the channel's centre,
/// times exp(-2 pi j centre n) at sample n of the stream. Around the stream there is silence. The same bits for any
/// cut of the stream and any number of threads.
///
/// Blocks of the stream that overlap are transformed once for all channels. A channel takes the bins around its centre
/// times its filter's gains through a short backward transform, and is turned by what its centre is off a bin. From
/// there an interpolator may have the rest of the ratio, and a channel that is far narrower than the stream goes
/// through another such object for itself.
template <class Sample>
class channelizer {
 public:
  using output = std::complex<real_of<Sample>>;

  /// Rejection in dB. Throws std::bad_alloc, dfti_failure.
  channelizer(std::span<const channel_request> channels, double rejection, std::size_t threads);
  channelizer(const channelizer &) = delete;
  channelizer &operator=(const channelizer &) = delete;
  ~channelizer();

  /// Samples of the stream so far, at most 2^60.
  [[nodiscard]] std::uint64_t inputs() const noexcept { return inputs_; }
  /// Outputs of a channel that the stream's first n samples give when more may come.
  [[nodiscard]] std::uint64_t outputs(std::size_t index, std::uint64_t n) const noexcept;
  /// Samples of the stream behind an output's place that may have to come before it is there.
  [[nodiscard]] double latency(std::size_t index) const noexcept;
  /// Filters that a channel goes through, one behind the other.
  [[nodiscard]] std::size_t filters(std::size_t index) const noexcept;

  /// Takes the stream's next samples. Each channel writes as many outputs as they give, or as it has room for where the
  /// stream's end is known, and what it wrote is taken off its room. Throws dfti_failure, and after that there is reset
  /// only. No memory is taken with one thread.
  void process(std::span<const Sample> in, std::span<output> *rooms);
  /// Goes on with silence until all room is written, and begins a new stream. Throws as process.
  void flush(std::span<output> *rooms);
  void reset() noexcept;

  /// Calls put with all that is remembered of the stream beside inputs().
  void save(const std::function<void(std::span<const std::byte>)> &put) const;
  /// Fills that again, by calls of take.
  void load(std::uint64_t inputs, const std::function<void(std::span<std::byte>)> &take);

  /// What lies in front of the stream's first sample instead of silence, its end at the end of x; before process.
  void lead_in(std::span<const Sample> x) noexcept;

 private:
  class channel;
  struct team;

  [[nodiscard]] std::uint64_t blocks(std::uint64_t n) const noexcept;
  void begin() noexcept;
  [[nodiscard]] std::int64_t begin_of_next() const noexcept;
  [[nodiscard]] std::size_t held_of(std::uint64_t n) const noexcept;
  void transform(const Sample *samples);
  void run_block(const Sample *samples, std::span<output> *rooms);
  void hold_overlap() noexcept;

  channel_plan plan_;
  std::vector<channel> channels_;
  std::vector<team> teams_;  // of one thread each
  // Complex blocks are transformed in place, long ones row by row, and real ones into half of their bins.
  std::optional<radix_pass<real_of<Sample>>> split_;
  dfti_descriptor in_place_;
  std::optional<block_transform<Sample>> apart_;
  qsrfhs::aligned_buffer<Sample> held_, block_;
  qsrfhs::aligned_buffer<output> bins_;
  std::size_t held_count_ = 0;
  std::uint64_t inputs_ = 0;
  // Block 0 gives the first outputs. A filter answers before a sample, too: what filters behind a channel's first need
  // of that, in front of the stream, is in block -1.
  std::int64_t first_block_ = 0, next_block_ = 0;
};

}  // namespace dsp
