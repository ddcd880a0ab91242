// What is said about a recording from outside. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace recording {

/// What the user calls the options below; messages that ask for one of them say it so.
struct option_names {
  std::string rate = "--rate", frequency = "--frequency", format = "--format", channel = "--input-channel",
              capture = "--capture", start = "--start", duration = "--duration";
};

/// Rate, frequency and format describe raw files, and override metadata. Indices count from 0; one below is refused in
/// the user's own figures, as one beyond the last is.
struct options {
  option_names names;
  std::optional<double> rate;             // samples per second
  std::optional<double> frequency;        // centre in hertz, of all captures
  std::optional<std::string> format;      // as parse_format takes it
  std::optional<std::int64_t> channel;    // of several interleaved ones; the first unless said
  std::optional<std::int64_t> capture;    // the one capture to use; all unless said
  std::optional<double> start, duration;  // seconds; the start counts from the beginning of the chosen capture
};

}  // namespace recording
