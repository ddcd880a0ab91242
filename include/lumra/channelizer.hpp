// Channels out of one wideband stream, over spans. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/channelizer.h>
#include <lumra/object.hpp>

#include <cstddef>
#include <cstdint>
#include <span>
#include <utility>
#include <vector>

namespace lumra {

/// A band of a stream, and the rate at which it is wanted; see channelizer.h.
struct channel {
  double centre_hz = 0, rate_hz = 0, passband = 0.9;
};

/// The channels of a stream of T. One thread at a time.
template <sample T>
class channelizer {
 public:
  using output = complex_type<T>;

  channelizer(double sample_rate_hz, std::span<const channel> channels, double rejection_db = 80,
              std::uint32_t threads = 1)
      : channelizer(detail::make<owned>([&](lumra_channelizer **out) {
          lumra_channelizer_options how = LUMRA_CHANNELIZER_OPTIONS;
          how.type = detail::type_code<T>;
          how.sample_rate_hz = sample_rate_hz;
          how.rejection_db = rejection_db;
          how.threads = threads;
          std::vector<lumra_channelizer_channel> records;
          for (const channel &c : channels) records.push_back({c.centre_hz, c.rate_hz, c.passband});
          return lumra_channelizer_create(&how, records.data(), records.size(), out);
        })) {}

  [[nodiscard]] std::size_t channels() const noexcept { return counts_.size(); }
  /// Samples of each channel that the stream's next n give, and those that a flush gives; valid until the next call.
  [[nodiscard]] std::span<const std::uint64_t> output_counts(std::size_t n) {
    check_open(lumra_channelizer_output_counts(channelizer_.get(), n, counts_.data()));
    return counts_;
  }
  [[nodiscard]] std::span<const std::uint64_t> flush_counts() {
    check_open(lumra_channelizer_flush_counts(channelizer_.get(), counts_.data()));
    return counts_;
  }

  /// Takes the stream's next samples. `out` has room for each channel. Returns how many samples each wrote, valid until
  /// the next call.
  std::span<const std::uint64_t> operator()(std::span<const T> in, std::span<const std::span<output>> out) {
    take_rooms(out);
    check_open(lumra_channelizer_process(channelizer_.get(), in.data(), in.size(), addresses_.data(), rooms_.data(),
                                         counts_.data()));
    return counts_;
  }
  [[nodiscard]] std::vector<std::vector<output>> operator()(std::span<const T> in) {
    return collect(output_counts(in.size()), [&](auto out) { (*this)(in, out); });
  }
  /// Ends the stream and begins a new one.
  std::span<const std::uint64_t> flush(std::span<const std::span<output>> out) {
    take_rooms(out);
    check_open(lumra_channelizer_flush(channelizer_.get(), addresses_.data(), rooms_.data(), counts_.data()));
    return counts_;
  }
  [[nodiscard]] std::vector<std::vector<output>> flush() {
    return collect(flush_counts(), [&](auto out) { flush(out); });
  }
  void reset() { check_open(lumra_channelizer_reset(channelizer_.get())); }

  [[nodiscard]] lumra_channelizer_figures figures(std::size_t index) const {
    lumra_channelizer_figures figures{};
    figures.size = sizeof figures;
    check_open(lumra_channelizer_get_figures(channelizer_.get(), index, &figures));
    return figures;
  }

  [[nodiscard]] std::vector<std::byte> save() const {
    return detail::save(channelizer_.get(), &lumra_channelizer_state_size, &lumra_channelizer_save);
  }
  /// A channelizer that goes on where the saved one was, which must be of T.
  [[nodiscard]] static channelizer load(std::span<const std::byte> bytes) {
    auto loaded = detail::make<owned>(
        [&](lumra_channelizer **out) { return lumra_channelizer_load(bytes.data(), bytes.size(), out); });
    std::int32_t type = 0;
    check_open(lumra_channelizer_get_type(loaded.get(), &type));
    if (type != detail::type_code<T>)
      throw error(status(LUMRA_WRONG_TYPE), "what was saved is for another type of samples");
    return channelizer(std::move(loaded));
  }

 private:
  using owned = detail::owned<lumra_channelizer, &lumra_channelizer_free>;

  explicit channelizer(owned made)
      : channelizer_(std::move(made)),
        counts_(detail::number_of(channelizer_.get(), &lumra_channelizer_get_count)),
        rooms_(counts_.size()),
        addresses_(counts_.size()) {}

  void take_rooms(std::span<const std::span<output>> out) {
    detail::require_length(out.size(), channels());
    for (std::size_t k = 0; k < out.size(); ++k) {
      addresses_[k] = out[k].data();
      rooms_[k] = out[k].size();
    }
  }
  /// Samples of all channels, of these counts, which write(rooms) writes.
  template <class Write>
  static std::vector<std::vector<output>> collect(std::span<const std::uint64_t> counts, Write write) {
    std::vector<std::vector<output>> all;
    for (const std::uint64_t count : counts) all.emplace_back(static_cast<std::size_t>(count));
    write(std::span<const std::span<output>>(std::vector<std::span<output>>(all.begin(), all.end())));
    return all;
  }

  owned channelizer_;
  std::vector<std::uint64_t> counts_, rooms_;
  std::vector<void *> addresses_;
};

}  // namespace lumra
