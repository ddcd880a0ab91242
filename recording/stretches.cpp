// SPDX-License-Identifier: MIT
#include <algorithm>
#include <cmath>

#include "recording/failure.hpp"
#include "recording/source.hpp"

namespace recording {
namespace {

/// Whether no sample and no change of frequency lies between a capture and the one behind it.
bool continues(const capture &before, const capture &now, double rate) {
  if (before.frequency != now.frequency || !before.begin || !now.begin) return false;
  if (before.global_index && now.global_index && *now.global_index - *before.global_index != before.samples)
    return false;
  const auto expected = static_cast<long double>(before.samples) / rate;
  return std::abs(now.begin->since(*before.begin) - expected) <= 0.5L / rate;
}

/// Samples in so many seconds, the nearest whole number.
std::uint64_t samples_in(double seconds, double rate, const char *what, const source &of) {
  const double count = std::round(seconds * rate);
  if (!(count >= 0 && count < 0x1p62))
    throw failure("{}: {} {} s is not a time in it; say seconds from 0", of.path.string(), what, seconds);
  return static_cast<std::uint64_t>(count);
}

std::uint64_t end_of(const capture &of) {
  return of.samples == endless ? endless : of.start + of.samples;
}

}  // namespace

void choose(source &of, const options &said) {
  if (said.channel && (*said.channel < 0 || static_cast<std::uint64_t>(*said.channel) >= of.channels))
    throw failure("{}: no channel {}; there {}, counted from 0: choose one with {}", of.path.string(), *said.channel,
                  of.channels == 1 ? "is 1" : fmt::format("are {}", of.channels), said.names.channel);
  of.channel = static_cast<std::uint64_t>(said.channel.value_or(0));
  if (said.frequency)
    for (capture &each : of.captures) each.frequency = said.frequency;
  if (said.capture && (*said.capture < 0 || static_cast<std::uint64_t>(*said.capture) >= of.captures.size()))
    throw failure("{}: no capture {}; there {}, counted from 0: choose one with {}", of.path.string(), *said.capture,
                  of.captures.size() == 1 ? "is 1" : fmt::format("are {}", of.captures.size()), said.names.capture);

  const auto chosen = static_cast<std::size_t>(said.capture.value_or(0));
  std::uint64_t first = of.captures[chosen].start;
  std::uint64_t end = end_of(said.capture ? of.captures[chosen] : of.captures.back());
  if (said.start) {
    const std::uint64_t skipped = samples_in(*said.start, of.rate, said.names.start.c_str(), of);
    if (end != endless && skipped > 0 && skipped >= end - first)
      throw failure("{}: {} {} s lies behind its end at {:.9g} s", of.path.string(), said.names.start, *said.start,
                    static_cast<double>(end - first) / of.rate);
    first += skipped;
  }
  if (said.duration) {
    const std::uint64_t wanted = samples_in(*said.duration, of.rate, said.names.duration.c_str(), of);
    if (wanted == 0)
      throw failure("{}: {} {} s is less than a sample; say more", of.path.string(), said.names.duration,
                    *said.duration);
    if (end == endless || wanted < end - first) end = first + wanted;
  }
  of.chosen_first = first;
  of.chosen_samples = end == endless ? endless : end - first;

  of.stretches.clear();
  const capture *before = nullptr;
  for (std::size_t i = said.capture ? chosen : 0; i < of.captures.size(); ++i) {
    const capture &now = of.captures[i];
    const std::uint64_t from = std::max(first, now.start), to = std::min(end, end_of(now));
    if (from >= to) continue;
    if (before && continues(*before, now, of.rate))
      of.stretches.back().samples = to - of.stretches.back().first;
    else
      of.stretches.push_back({from, to == endless ? endless : to - from, now.frequency, i});
    before = &now;
  }
  of.frequency = of.captures[chosen].frequency;
  if (!of.stretches.empty()) of.frequency = of.stretches.front().frequency;
  for (const stretch &each : of.stretches)
    if (each.frequency != of.frequency) of.frequency.reset();
}

const stretch &only_stretch(const source &of, const option_names &names) {
  if (of.stretches.empty()) throw failure("{}: holds no samples", of.data.string());
  if (of.stretches.size() == 1) return of.stretches.front();
  const stretch &first = of.stretches[0], &second = of.stretches[1];
  throw failure("{}: {} captures {} and {}; choose one with {}", of.path.string(),
                first.frequency != second.frequency ? "there is another centre frequency between"
                                                    : "nothing says that no samples are missing between",
                second.capture - 1, second.capture, names.capture);
}

}  // namespace recording
