// SPDX-License-Identifier: MIT
#include "analysis/selection.hpp"

#include <fmt/core.h>

#include <algorithm>
#include <iterator>

#include "terminal/append.hpp"
#include "terminal/failure.hpp"
#include "terminal/units.hpp"

namespace tool {
namespace {

using recording::stretch;

/// Nothing is longer than an input without an end.
std::uint64_t sum_of(std::uint64_t a, std::uint64_t b) {
  return a == recording::endless || b == recording::endless ? recording::endless : a + b;
}

selection of_stretches(const recording::source &source, std::vector<stretch> stretches) {
  selection chosen;
  chosen.frequency = stretches.front().frequency;
  for (const stretch &each : stretches) chosen.samples = sum_of(chosen.samples, each.samples);
  if (stretches.size() < source.stretches.size()) {
    constexpr std::size_t most_named = 8;
    std::string names;
    for (std::size_t i = 0; i < std::min(stretches.size(), most_named); ++i)
      append(names, "{}{}", i == 0 ? "" : ", ", stretches[i].capture);
    if (stretches.size() > most_named) names += ", ...";
    chosen.text =
        fmt::format("{} {} alone{}; choose another one with --capture", stretches.size() == 1 ? "capture" : "captures",
                    names, chosen.frequency ? ", at " + exact_text(*chosen.frequency) : "");
  }
  chosen.stretches = std::move(stretches);
  return chosen;
}

void require_samples(const recording::source &source) {
  if (source.stretches.empty()) throw failure("{}: holds no samples", source.data.string());
}

}  // namespace

selection select_all(const recording::source &source) {
  require_samples(source);
  return of_stretches(source, source.stretches);
}

selection select_frequency(const recording::source &source) {
  require_samples(source);
  std::vector<std::vector<stretch>> groups;
  for (const stretch &each : source.stretches) {
    auto group = std::find_if(groups.begin(), groups.end(),
                              [&](const auto &found) { return found.front().frequency == each.frequency; });
    if (group == groups.end()) group = groups.emplace(groups.end());
    group->push_back(each);
  }
  const auto length = [](const std::vector<stretch> &group) {
    std::uint64_t sum = 0;
    for (const stretch &each : group) sum = sum_of(sum, each.samples);
    return sum;
  };
  return of_stretches(source, *std::max_element(groups.begin(), groups.end(),
                                                [&](const auto &a, const auto &b) { return length(a) < length(b); }));
}

selection select_stretch(const recording::source &source) {
  require_samples(source);
  return of_stretches(source,
                      {*std::max_element(source.stretches.begin(), source.stretches.end(),
                                         [](const stretch &a, const stretch &b) { return a.samples < b.samples; })});
}

}  // namespace tool
