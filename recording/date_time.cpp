// SPDX-License-Identifier: MIT
#include "recording/date_time.hpp"

#include <fmt/core.h>

#include <algorithm>
#include <charconv>
#include <chrono>
#include <cmath>

namespace recording {
namespace {

/// Takes so many digits and the character behind them off the front; gives -1 where they are not there.
int take_digits(std::string_view &text, std::size_t digits, char behind) {
  int value = 0;
  if (text.size() <= digits || text[digits] != behind) return -1;
  const char *const end = text.data() + digits;
  if (text.front() == '-' || std::from_chars(text.data(), end, value).ptr != end) return -1;
  text.remove_prefix(digits + 1);
  return value;
}

}  // namespace

std::optional<date_time> parse_date_time(std::string_view text) {
  const int year = take_digits(text, 4, '-'), month = take_digits(text, 2, '-'), day = take_digits(text, 2, 'T');
  const int hour = take_digits(text, 2, ':'), minute = take_digits(text, 2, ':');
  if (!text.ends_with('Z')) return std::nullopt;
  const std::size_t whole = std::min(text.find('.'), text.size() - 1);  // length of the seconds
  if (whole != 2) return std::nullopt;
  std::string_view fraction = text.substr(whole, text.size() - 1 - whole);
  const char last = text[whole];
  const int second = take_digits(text, 2, last);
  if (std::min({year, month, day, hour, minute, second}) < 0) return std::nullopt;
  const std::chrono::year_month_day date{std::chrono::year(year), std::chrono::month(static_cast<unsigned>(month)),
                                         std::chrono::day(static_cast<unsigned>(day))};
  if (!date.ok() || hour > 23 || minute > 59 || second > 60) return std::nullopt;

  double part = 0;
  if (!fraction.empty()) {
    if (fraction.find_first_not_of("0123456789", 1) != std::string_view::npos || fraction.size() < 2)
      return std::nullopt;
    if (std::from_chars(fraction.data(), fraction.data() + fraction.size(), part).ec != std::errc())
      return std::nullopt;
  }
  const std::int64_t days = std::chrono::sys_days(date).time_since_epoch().count();
  return date_time{((days * 24 + hour) * 60 + minute) * 60 + second, part};
}

date_time later(const date_time &than, long double seconds) {
  const long double part = than.part + (seconds - std::floor(seconds));
  const auto carried = static_cast<std::int64_t>(std::floor(part));
  return {than.seconds + static_cast<std::int64_t>(std::floor(seconds)) + carried,
          static_cast<double>(part - static_cast<long double>(carried))};
}

std::string text_of(const date_time &time) {
  const auto nanoseconds = std::llround(time.part * 1e9);
  const std::chrono::sys_seconds at{std::chrono::seconds(time.seconds + nanoseconds / 1'000'000'000)};
  const auto day = std::chrono::floor<std::chrono::days>(at);
  const std::chrono::year_month_day date(day);
  const std::chrono::hh_mm_ss clock(at - day);
  return fmt::format("{:04}-{:02}-{:02}T{:02}:{:02}:{:02}.{:09}Z", static_cast<int>(date.year()),
                     static_cast<unsigned>(date.month()), static_cast<unsigned>(date.day()), clock.hours().count(),
                     clock.minutes().count(), clock.seconds().count(), nanoseconds % 1'000'000'000);
}

}  // namespace recording
