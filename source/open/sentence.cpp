// SPDX-License-Identifier: MIT
#include "open/sentence.hpp"

#include <algorithm>
#include <charconv>
#include <cstring>
#include <system_error>

namespace doors {

sentence &sentence::operator<<(std::string_view text) noexcept {
  const std::size_t count = std::min(text.size(), capacity - length_);
  std::memcpy(text_ + length_, text.data(), count);
  length_ += count;
  return *this;
}

template <class Number>
void sentence::append_number(Number number) noexcept {
  const auto written = std::to_chars(text_ + length_, text_ + capacity, number);
  if (written.ec == std::errc()) length_ = static_cast<std::size_t>(written.ptr - text_);
}

sentence &sentence::operator<<(double number) noexcept {
  append_number(number);
  return *this;
}

sentence &sentence::operator<<(std::uint64_t number) noexcept {
  append_number(number);
  return *this;
}

sentence &sentence::operator<<(std::int64_t number) noexcept {
  append_number(number);
  return *this;
}

}  // namespace doors
