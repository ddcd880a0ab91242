// SPDX-License-Identifier: MIT
#include "signal/channelizer.hpp"

#include <lumra/channelizer.h>

#include <algorithm>
#include <cmath>
#include <complex>
#include <cstdint>
#include <functional>
#include <memory>
#include <span>
#include <utility>
#include <variant>
#include <vector>

#include "open/door.hpp"
#include "open/element.hpp"
#include "open/handle.hpp"
#include "open/option_checks.hpp"
#include "open/result.hpp"
#include "open/state.hpp"
#include "signal/band_filter.hpp"
#include "signal/workers.hpp"

namespace doors {
namespace {

using cf32 = std::complex<float>;
using cf64 = std::complex<double>;

constexpr std::uint64_t most_channels = 4096, longest_stream = std::uint64_t{1} << 60;
constexpr double usual_passband = 0.9;

/// A channelizer with what it needs for each call, so that none takes memory.
template <class Sample>
struct channels_of {
  using output = typename dsp::channelizer<Sample>::output;

  dsp::channelizer<Sample> work;
  std::vector<std::span<output>> rooms, in_order;

  channels_of(std::span<const dsp::channel_request> requests, double rejection, std::size_t threads)
      : work(requests, rejection, threads), rooms(requests.size()), in_order(requests.size()) {}
};

struct channelizer_object {
  lumra_channelizer_options options;
  std::vector<lumra_channelizer_channel> channels;
  std::vector<dsp::channel_request> requests;
  std::variant<std::monostate, channels_of<float>, channels_of<double>, channels_of<cf32>, channels_of<cf64>> all;
};
using channelizers = handles<lumra_channelizer, channelizer_object>;

constexpr state_kind saved_channelizer{{'c', 'h', 'n'}, 2};

void check(const lumra_channelizer_options &options) {
  require_type(options.type);
  require_rate(options.sample_rate_hz, "options->sample_rate_hz");
  require_rejection(options.rejection_db, options.type);
  require_threads(options.threads, "options->threads");
  require(options.reserved == 0, LUMRA_OUT_OF_RANGE, "options->reserved is ", options.reserved, "; it is 0");
}

void require_count(std::uint64_t count) {
  require(count >= 1 && count <= most_channels, LUMRA_OUT_OF_RANGE, "count is ", count, "; a channelizer has 1 to ",
          most_channels, " channels");
}

/// The channel with its default; throws refusal.
lumra_channelizer_channel checked(lumra_channelizer_channel channel, double sample_rate, std::uint64_t index) {
  const double rate = channel.rate_hz;
  require(rate > 0 && rate <= sample_rate && dsp::rate_ratio::are_near(rate, sample_rate), LUMRA_OUT_OF_RANGE,
          "channels[", index, "].rate_hz is ", rate, "; it is above 10^-9 of the sample rate and at most ",
          sample_rate);
  if (channel.passband == 0) channel.passband = usual_passband;
  require_passband(channel.passband, "channels[", index, "].passband");
  const double half = sample_rate / 2, centre = channel.centre_hz;
  require(centre >= -half && centre <= half, LUMRA_OUT_OF_RANGE, "channels[", index, "].centre_hz is ", centre,
          "; it is from ", -half, " to ", half);
  const double edge = channel.passband * rate / 2;
  require(std::abs(centre) + edge <= half, LUMRA_OUT_OF_RANGE, "channels[", index, "] is from ", centre - edge, " to ",
          centre + edge, " Hz; the stream's band is ", -half, " to ", half, " Hz");
  return channel;
}

/// Of options and channels that are checked.
std::unique_ptr<channelizer_object> make(const lumra_channelizer_options &options,
                                         std::vector<lumra_channelizer_channel> channels) {
  auto object = std::make_unique<channelizer_object>();
  object->options = options;
  object->channels = std::move(channels);
  for (const lumra_channelizer_channel &channel : object->channels)
    object->requests.push_back({dsp::exact_cycles::of(channel.centre_hz, options.sample_rate_hz),
                                dsp::rate_ratio(channel.rate_hz, options.sample_rate_hz), channel.passband});
  with_type(options.type, [&]<class Sample>(element<Sample>) {
    object->all.emplace<channels_of<Sample>>(object->requests, options.rejection_db,
                                             dsp::thread_count(options.threads));
  });
  return object;
}

/// Calls work(channels_of<Sample> &).
template <class Object, class Work>
void with_channels(Object &object, Work &&work) {
  std::visit(
      [&](auto &all) {
        if constexpr (!std::is_same_v<std::remove_cvref_t<decltype(all)>, std::monostate>) work(all);
      },
      object.all);
}

template <class Sample>
void require_length(const channels_of<Sample> &all, std::uint64_t n) {
  require(n <= longest_stream - all.work.inputs(), LUMRA_OUT_OF_RANGE, "n is ", n, " behind ", all.work.inputs(),
          " samples; a stream has at most 2^60, then flush");
}

template <class Sample>
std::uint64_t outputs_of_next(const channels_of<Sample> &all, std::size_t index, std::uint64_t n) {
  return all.work.outputs(index, all.work.inputs() + n) - all.work.outputs(index, all.work.inputs());
}

template <class Sample>
std::uint64_t outputs_of_flush(const channelizer_object &object, const channels_of<Sample> &all, std::size_t index) {
  const std::uint64_t n = all.work.inputs();
  return static_cast<std::uint64_t>(object.requests[index].ratio.outputs(n)) - all.work.outputs(index, n);
}

/// The channels' rooms, each as long as what is written there: count(index).
template <class Sample, class Count>
void take_rooms(channels_of<Sample> &all, std::span<const Sample> in, void *const *out, const std::uint64_t *room,
                Count count) {
  using output = typename channels_of<Sample>::output;
  require_present(out, "out");
  require_present(room, "room");
  for (std::size_t k = 0; k < all.rooms.size(); ++k) {
    const std::uint64_t index = k, samples = count(k);
    require(room[k] >= samples, LUMRA_TOO_LITTLE_ROOM, "room[", index, "] is ", room[k], "; ", samples,
            " samples come");
    require(samples == 0 || out[k] != nullptr, LUMRA_NULL_ARGUMENT, "out[", index, "] is null; give room for ", samples,
            " samples");
    all.rooms[k] = array(static_cast<output *>(out[k]), samples, "out");
    require_apart(all.rooms[k], "an output", in, "in");
  }
  std::copy(all.rooms.begin(), all.rooms.end(), all.in_order.begin());
  std::sort(all.in_order.begin(), all.in_order.end(),
            [](const auto &a, const auto &b) { return std::less<>()(a.data(), b.data()); });
  for (std::size_t k = 1; k < all.in_order.size(); ++k)
    require_apart(all.in_order[k - 1], "an output", all.in_order[k], "another");
}

template <class Sample>
void tell_written(const channels_of<Sample> &all, std::uint64_t *written) noexcept {
  if (!written) return;
  for (const auto &room : all.rooms) *written++ = room.size();
}

void write(state_writer &to, const channelizer_object &object) {
  to.add(object.options.type);
  to.add(object.options.threads);
  to.add(object.options.sample_rate_hz);
  to.add(object.options.rejection_db);
  to.add(std::uint64_t{object.channels.size()});
  to.add_all(std::span<const lumra_channelizer_channel>(object.channels));
  with_channels(object, [&](const auto &all) {
    to.add(all.work.inputs());
    all.work.save([&to](std::span<const std::byte> bytes) { to.add_all(bytes); });
  });
}

/// What would be refused otherwise is no state.
void read(state_reader from, lumra_channelizer **out) {
  lumra_channelizer_options options = LUMRA_CHANNELIZER_OPTIONS;
  options.type = from.take<std::int32_t>();
  options.threads = from.take<std::uint32_t>();
  options.sample_rate_hz = from.take<double>();
  options.rejection_db = from.take<double>();
  const auto count = from.take<std::uint64_t>();
  std::vector<lumra_channelizer_channel> channels;
  try {
    check(options);
    require_count(count);
    channels.resize(static_cast<std::size_t>(count));
    from.take_all(std::span(channels));
    for (std::size_t k = 0; k < channels.size(); ++k) channels[k] = checked(channels[k], options.sample_rate_hz, k);
  } catch (const refusal &) {
    refuse(LUMRA_BAD_STATE, "the saved bytes describe no channelizer");
  }
  const auto inputs = from.take<std::uint64_t>();
  require(inputs <= longest_stream, LUMRA_BAD_STATE, "the saved bytes describe no stream");
  auto object = make(options, std::move(channels));
  with_channels(*object, [&](auto &all) {
    all.work.load(inputs, [&from](std::span<std::byte> bytes) { from.take_all(bytes); });
  });
  from.finish();
  channelizers::give(out, std::move(object));
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_channelizer_create(const lumra_channelizer_options *options,
                                      const lumra_channelizer_channel *channels, uint64_t count,
                                      lumra_channelizer **channelizer) {
  return enter(__func__, [&] {
    const lumra_channelizer_options wanted =
        read_options<lumra_channelizer_options>(options, LUMRA_CHANNELIZER_OPTIONS);
    check(wanted);
    require_count(count);
    const auto given = array(channels, count, "channels");
    std::vector<lumra_channelizer_channel> all(given.begin(), given.end());
    for (std::size_t k = 0; k < all.size(); ++k) all[k] = checked(all[k], wanted.sample_rate_hz, k);
    require_present(channelizer, "channelizer");
    channelizers::give(channelizer, make(wanted, std::move(all)));
  });
}

lumra_status lumra_channelizer_output_counts(const lumra_channelizer *channelizer, uint64_t n, uint64_t *counts) {
  return enter(__func__, [&] {
    with_channels(channelizers::get(channelizer, "channelizer"), [&](const auto &all) {
      require_length(all, n);
      require_present(counts, "counts");
      for (std::size_t k = 0; k < all.rooms.size(); ++k) counts[k] = outputs_of_next(all, k, n);
    });
  });
}

lumra_status lumra_channelizer_process(lumra_channelizer *channelizer, const void *in, uint64_t n, void *const *out,
                                       const uint64_t *room, uint64_t *written) {
  return enter(__func__, [&] {
    with_channels(channelizers::get(channelizer, "channelizer"), [&]<class Sample>(channels_of<Sample> &all) {
      require_length(all, n);
      const auto samples = array(static_cast<const Sample *>(in), n, "in");
      take_rooms(all, samples, out, room, [&](std::size_t k) { return outputs_of_next(all, k, n); });
      tell_written(all, written);
      all.work.process(samples, all.rooms.data());
    });
  });
}

lumra_status lumra_channelizer_flush_counts(const lumra_channelizer *channelizer, uint64_t *counts) {
  return enter(__func__, [&] {
    const channelizer_object &object = channelizers::get(channelizer, "channelizer");
    require_present(counts, "counts");
    with_channels(object, [&](const auto &all) {
      for (std::size_t k = 0; k < all.rooms.size(); ++k) counts[k] = outputs_of_flush(object, all, k);
    });
  });
}

lumra_status lumra_channelizer_flush(lumra_channelizer *channelizer, void *const *out, const uint64_t *room,
                                     uint64_t *written) {
  return enter(__func__, [&] {
    channelizer_object &object = channelizers::get(channelizer, "channelizer");
    with_channels(object, [&]<class Sample>(channels_of<Sample> &all) {
      take_rooms<Sample>(all, {}, out, room, [&](std::size_t k) { return outputs_of_flush(object, all, k); });
      tell_written(all, written);
      all.work.flush(all.rooms.data());
    });
  });
}

lumra_status lumra_channelizer_reset(lumra_channelizer *channelizer) {
  return enter(__func__, [&] {
    with_channels(channelizers::get(channelizer, "channelizer"), [](auto &all) { all.work.reset(); });
  });
}

lumra_status lumra_channelizer_get_figures(const lumra_channelizer *channelizer, uint64_t index,
                                           lumra_channelizer_figures *figures) {
  return enter(__func__, [&] {
    const channelizer_object &object = channelizers::get(channelizer, "channelizer");
    require(index < object.channels.size(), LUMRA_OUT_OF_RANGE, "index is ", index, "; there are ",
            std::uint64_t{object.channels.size()}, " channels");
    require_sized(figures, "figures");
    const lumra_channelizer_channel &channel = object.channels[index];
    lumra_channelizer_figures result{};
    result.centre_hz = channel.centre_hz;
    result.rate_hz = channel.rate_hz;
    result.stop_edge_hz = channel.rate_hz / 2;
    result.pass_edge_hz =
        object.requests[index].is_whole() ? result.stop_edge_hz : channel.passband * channel.rate_hz / 2;
    result.rejection_db = object.options.rejection_db;
    with_channels(object, [&](const auto &all) {
      result.ripple_db = static_cast<double>(all.work.filters(index)) * dsp::band_filter::ripple(result.rejection_db);
      result.latency_samples = static_cast<std::uint64_t>(std::ceil(all.work.latency(index)));
    });
    result.latency_s = static_cast<double>(result.latency_samples) / object.options.sample_rate_hz;
    give_result(figures, result);
  });
}

lumra_status lumra_channelizer_get_count(const lumra_channelizer *channelizer, uint64_t *count) {
  return enter(__func__, [&] {
    const channelizer_object &object = channelizers::get(channelizer, "channelizer");
    require_present(count, "count");
    *count = object.channels.size();
  });
}

lumra_status lumra_channelizer_get_type(const lumra_channelizer *channelizer, int32_t *type) {
  return enter(__func__, [&] {
    const channelizer_object &object = channelizers::get(channelizer, "channelizer");
    require_present(type, "type");
    *type = object.options.type;
  });
}

lumra_status lumra_channelizer_state_size(const lumra_channelizer *channelizer, uint64_t *size) {
  return enter(__func__, [&] {
    const channelizer_object &object = channelizers::get(channelizer, "channelizer");
    require_present(size, "size");
    *size = state_size([&object](state_writer &to) { write(to, object); });
  });
}

lumra_status lumra_channelizer_save(const lumra_channelizer *channelizer, void *bytes, uint64_t room) {
  return enter(__func__, [&] {
    const channelizer_object &object = channelizers::get(channelizer, "channelizer");
    save_state(saved_channelizer, bytes, room, [&object](state_writer &to) { write(to, object); });
  });
}

lumra_status lumra_channelizer_load(const void *bytes, uint64_t size, lumra_channelizer **channelizer) {
  return enter(__func__, [&] {
    require_present(channelizer, "channelizer");
    read(open_state(saved_channelizer, bytes, size), channelizer);
  });
}

void lumra_channelizer_free(lumra_channelizer *channelizer) {
  channelizers::free(channelizer);
}
