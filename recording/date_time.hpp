// Points in time as SigMF writes them. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace recording {

/// A point in time: whole seconds since 1970 (UTC, without leap seconds) and the part of a second behind them.
struct date_time {
  std::int64_t seconds = 0;
  double part = 0;  // 0 up to 1

  [[nodiscard]] long double since(const date_time &earlier) const noexcept {  // seconds
    return static_cast<long double>(seconds - earlier.seconds) + (static_cast<long double>(part) - earlier.part);
  }
};

/// Reads "2024-05-06T07:08:09.123Z", with any number of digits behind the point, or none. Gives nothing for a text that
/// is no such time.
std::optional<date_time> parse_date_time(std::string_view text);

/// The time so many seconds later, which are not negative.
date_time later(const date_time &than, long double seconds);

/// The time with nine digits behind the point.
std::string text_of(const date_time &time);

}  // namespace recording
