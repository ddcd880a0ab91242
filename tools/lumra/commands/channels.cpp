// lumra channels: channels of a wideband recording as recordings of their own. SPDX-License-Identifier: MIT
#include <fmt/core.h>

#include <algorithm>
#include <cmath>
#include <complex>
#include <lumra/lumra.hpp>
#include <memory>
#include <nlohmann/json.hpp>
#include <vector>

#include "commands/arguments.hpp"
#include "commands/commands.hpp"
#include "commands/inputs.hpp"
#include "commands/resampling_options.hpp"
#include "recording/open.hpp"
#include "terminal/failure.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

namespace fs = std::filesystem;
using sample = std::complex<float>;

struct wanted_channel {
  double centre_hz, rate_hz;  // the centre is absolute
};

struct channels_command {
  std::string path, output;
  recording::options options;
  resampling_arguments resampling{80};
  output_arguments outputs;
  std::vector<std::string> channel_texts;

  std::vector<wanted_channel> channels;
};

void parse(channels_command &command) {
  if (command.channel_texts.empty()) throw wrong_usage("--channel CENTER:RATE is required");
  for (const std::string &text : command.channel_texts) {
    const std::vector<double> numbers = parse_numbers("--channel", text, ':');
    if (numbers.size() != 2 || !(numbers[1] > 0))
      throw wrong_usage("--channel: '{}' is not CENTER:RATE with a rate above 0", text);
    command.channels.push_back({numbers[0], numbers[1]});
  }
}

fs::path output_base(const channels_command &command, const recording::source &source) {
  if (!command.output.empty()) return result_base(command.output);
  if (source.files.empty()) throw failure("the standard input: say how the results are called, with --output BASE");
  return source.files.front().parent_path() / source.files.front().stem();
}

/// The channels as the library takes them. Throws failure for those that the recording does not hold.
std::vector<lumra::channel> channels_in(const channels_command &command, const recording::source &source,
                                        double frequency) {
  std::vector<lumra::channel> channels;
  for (const wanted_channel &each : command.channels) {
    const double offset = each.centre_hz - frequency, edge = command.resampling.passband * each.rate_hz / 2;
    if (each.rate_hz > source.rate)
      throw failure("{}: a channel at {} is wider than the recording, at {}; resample it instead", source.data.string(),
                    exact_text(each.rate_hz), exact_text(source.rate));
    if (std::abs(offset) + edge > source.rate / 2)
      throw failure("{}: the channel at {} around {} keeps {} to {}, beyond the band, {} to {}", source.data.string(),
                    exact_text(each.rate_hz), exact_text(each.centre_hz), exact_text(each.centre_hz - edge),
                    exact_text(each.centre_hz + edge), exact_text(frequency - source.rate / 2),
                    exact_text(frequency + source.rate / 2));
    channels.push_back({offset, each.rate_hz, command.resampling.passband});
  }
  return channels;
}

struct taken_channels {
  std::uint64_t samples_in = 0;
  std::vector<filter_figures> filters;
};

/// Room for the outputs of all channels, which a call may fill.
class channel_rooms {
 public:
  std::span<const std::span<sample>> of(std::span<const std::uint64_t> counts) {
    samples_.resize(counts.size());
    rooms_.clear();
    for (std::size_t k = 0; k < counts.size(); ++k) {
      samples_[k].resize(std::max(samples_[k].size(), static_cast<std::size_t>(counts[k])));
      rooms_.push_back(std::span(samples_[k]).first(static_cast<std::size_t>(counts[k])));
    }
    return rooms_;
  }
  void write_to(std::vector<resampled_result> &results) const {
    for (std::size_t k = 0; k < rooms_.size(); ++k) results[k].file.write(std::span<const sample>(rooms_[k]));
  }

 private:
  std::vector<std::vector<sample>> samples_;
  std::vector<std::span<sample>> rooms_;
};

/// Writes the channels of all stretches, each from its first sample to its last.
template <class T>
taken_channels run(const channels_command &command, const recording::source &source, const selection &chosen,
                   std::vector<resampled_result> &results) {
  const std::vector<lumra::channel> channels = channels_in(command, source, chosen.frequency.value_or(0));
  lumra::channelizer<T> channelizer(source.rate, channels, command.resampling.rejection_db, command.outputs.threads);
  channel_rooms rooms;
  const auto take = [&](const sample_block &samples) {
    (void)channelizer(samples_of<T>(samples), rooms.of(channelizer.output_counts(samples.count)));
    rooms.write_to(results);
  };
  const auto end = [&](const sample_range &stretch) {
    (void)channelizer.flush(rooms.of(channelizer.flush_counts()));
    rooms.write_to(results);
    for (resampled_result &each : results) each.end_stretch(stretch);
  };
  taken_channels taken;
  const auto block = static_cast<std::size_t>(command.resampling.block);
  taken.samples_in = each_stretch(source, chosen, block, "Filtering", take, end);
  for (std::size_t k = 0; k < channels.size(); ++k) {
    const lumra_channelizer_figures is = channelizer.figures(k);
    taken.filters.push_back({is.rate_hz, is.pass_edge_hz, is.stop_edge_hz, is.ripple_db, is.rejection_db});
  }
  return taken;
}

results run(const channels_command &command) {
  const recording::source source = recording::open(command.path, command.options);
  const selection chosen = select_frequency(source);
  (void)channels_in(command, source, chosen.frequency.value_or(0));
  const recording::sample_format format = result_format(source, command.resampling.datatype, {});
  if (!format.is_complex)
    throw failure("{}: channels are complex, of which {} would keep a half; use a type that begins with c",
                  source.data.string(), command.resampling.datatype);
  const fs::path base = output_base(command, source);
  results given(source.files);
  const output_files reports = begin_outputs(given, command.outputs);
  std::vector<resampled_result> made;
  made.reserve(command.channels.size());
  for (std::size_t k = 1; k <= command.channels.size(); ++k) {
    fs::path numbered = base;
    numbered += fmt::format("-{}", k);
    made.push_back({sigmf_result(given, source, numbered, format), {}});
  }
  const auto work = source.format.is_complex ? &run<sample> : &run<float>;
  const taken_channels taken = work(command, source, chosen, made);

  add_recording_lines(given, source, chosen);
  given.add_line("Input samples", length_text(taken.samples_in, source.rate));
  for (std::size_t k = 0; k < made.size(); ++k) {
    const wanted_channel &channel = command.channels[k];
    made[k].finish(source, {.pieces = {},
                            .rate = channel.rate_hz,
                            .frequency = channel.centre_hz,
                            .datatype = {},
                            .description = fmt::format("channel around {} by lumra {}", exact_text(channel.centre_hz),
                                                       lumra::library().version_text)});
    given.add_line("Channel", fmt::format("around {}", exact_text(channel.centre_hz)));
    add_filter_lines(given, taken.filters[k]);
    add_result_lines(given, made[k].file, channel.rate_hz);
    if (reports.json)
      write_json(*reports.json, resampling_json(taken.samples_in, made[k].file.samples(), taken.filters[k]));
  }
  add_output_lines(given, command.outputs);
  return given;
}

}  // namespace

void add_channels(CLI::App &program, work_to_do &work) {
  auto command = std::make_shared<channels_command>();
  CLI::App *app = add_command(program, "channels", "Channels of a wideband recording as recordings of their own");
  app->footer(
      "Sample k of a channel lies at the time k / rate, exactly, as far as the recording reaches; its frequency is "
      "that "
      "of its centre. What lies beyond half its rate is rejected. Every capture is filtered for itself, unless it "
      "continues the one before. Captures and annotations are carried over; annotations are cut to the channel.");
  app->add_option("RECORDING", command->path, recording_help)->required();
  app->add_option("--channel", command->channel_texts,
                  "A channel by its centre in hertz and its sample rate; may be repeated (required)")
      ->option_text("CENTER:RATE")
      ->allow_extra_args(false);
  add_resampling_options(*app, command->resampling);
  add_recording_options(*app, command->options);
  add_capture_option(*app, command->options, capture_help);
  app->add_option("--output", command->output,
                  "Write BASE-1.sigmf-data and BASE-1.sigmf-meta, BASE-2 and so on (default: the recording's name)")
      ->option_text("BASE");
  add_outputs(*app, command->outputs, {nullptr, nullptr, false});
  app->callback([command, &work] {
    parse(*command);
    work = [command] { return run(*command); };
  });
}

}  // namespace tool
