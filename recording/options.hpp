// What is said about a recording from outside. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace recording {

/// What the user calls the options below; messages that ask for one of them say it so.
struct option_names {
  std::string rate = "--rate", format = "--format", capture = "--capture";
};

/// Rate and format describe raw files, and override metadata.
struct options {
  option_names names;
  std::optional<double> rate;            // samples per second
  std::optional<std::string> format;     // as parse_format takes it
  std::optional<std::uint64_t> capture;  // index of the one capture to use
};

}  // namespace recording
