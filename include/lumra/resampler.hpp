// Streams at other sample rates, over spans. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/resampler.h>
#include <lumra/object.hpp>

#include <cstddef>
#include <cstdint>
#include <span>
#include <utility>
#include <vector>

namespace lumra {

/// Rates, or their fraction, and how well they are changed; see resampler.h.
struct resampling {
  double input_rate_hz = 1, output_rate_hz = 1;
  std::uint64_t up = 0, down = 0;  // the fraction, where doubles do not hold the rates
  double passband = 0.9, rejection_db = 100;
  std::uint32_t channels = 1, threads = 1;
};

/// Streams of T at another rate. With more than one channel, samples lie in rows one behind the other, inputs and
/// outputs alike. One thread at a time.
template <sample T>
class stream_resampler {
 public:
  explicit stream_resampler(const resampling &how)
      : resampler_(detail::make<owned>([&](lumra_resampler **out) {
          lumra_resampler_options options = LUMRA_RESAMPLER_OPTIONS;
          options.type = detail::type_code<T>;
          options.input_rate_hz = how.input_rate_hz;
          options.output_rate_hz = how.output_rate_hz;
          options.up = how.up;
          options.down = how.down;
          options.passband = how.passband;
          options.rejection_db = how.rejection_db;
          options.channels = how.channels;
          options.threads = how.threads;
          return lumra_resampler_create(&options, out);
        })),
        channels_(how.channels) {}
  stream_resampler(double input_rate_hz, double output_rate_hz)
      : stream_resampler(resampling{.input_rate_hz = input_rate_hz, .output_rate_hz = output_rate_hz}) {}

  /// Samples of a row that the next n of one give, and those that a flush gives.
  [[nodiscard]] std::size_t output_count(std::size_t n) const {
    std::uint64_t count = 0;
    check_open(lumra_resampler_output_count(resampler_.get(), n, &count));
    return static_cast<std::size_t>(count);
  }
  [[nodiscard]] std::size_t flush_count() const {
    return detail::number_of(resampler_.get(), &lumra_resampler_flush_count);
  }

  /// Takes the next samples of all rows. Returns how many of each row were written; rows of `out` are as long as it has
  /// room for.
  std::size_t operator()(std::span<const T> in, std::span<T> out) {
    const std::size_t n = row_of(in.size()), room = out.size() / channels_;
    std::uint64_t written = 0;
    check_open(lumra_resampler_process(resampler_.get(), in.data(), n, n, out.data(), room, room, &written));
    return static_cast<std::size_t>(written);
  }
  [[nodiscard]] std::vector<T> operator()(std::span<const T> in) {
    std::vector<T> out(channels_ * output_count(row_of(in.size())));
    (*this)(in, out);
    return out;
  }
  /// Ends the stream and begins a new one.
  std::size_t flush(std::span<T> out) {
    const std::size_t room = out.size() / channels_;
    std::uint64_t written = 0;
    check_open(lumra_resampler_flush(resampler_.get(), out.data(), room, room, &written));
    return static_cast<std::size_t>(written);
  }
  [[nodiscard]] std::vector<T> flush() {
    std::vector<T> out(channels_ * flush_count());
    flush(out);
    return out;
  }
  void reset() { check_open(lumra_resampler_reset(resampler_.get())); }

  [[nodiscard]] lumra_resampler_figures figures() const {
    lumra_resampler_figures figures{};
    figures.size = sizeof figures;
    check_open(lumra_resampler_get_figures(resampler_.get(), &figures));
    return figures;
  }

  [[nodiscard]] std::vector<std::byte> save() const {
    return detail::save(resampler_.get(), &lumra_resampler_state_size, &lumra_resampler_save);
  }
  /// A resampler that goes on where the saved one was, which must be of T.
  [[nodiscard]] static stream_resampler load(std::span<const std::byte> bytes) {
    return stream_resampler(detail::make<owned>(
        [&](lumra_resampler **out) { return lumra_resampler_load(bytes.data(), bytes.size(), out); }));
  }

 private:
  using owned = detail::owned<lumra_resampler, &lumra_resampler_free>;

  explicit stream_resampler(owned loaded) : resampler_(std::move(loaded)) {
    lumra_resampler_options options = LUMRA_RESAMPLER_OPTIONS;
    check_open(lumra_resampler_get_options(resampler_.get(), &options));
    if (options.type != detail::type_code<T>)
      throw error(status(LUMRA_WRONG_TYPE), "what was saved is for another type of samples");
    channels_ = options.channels;
  }
  [[nodiscard]] std::size_t row_of(std::size_t samples) const {
    detail::require_length(samples % channels_, 0);
    return samples / channels_;
  }

  owned resampler_;
  std::size_t channels_;
};

}  // namespace lumra
