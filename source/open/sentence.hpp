// What the open interface says of a failure. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace doors {

/// Text of limited length, cut where it is full, made without memory of its own or the process's language settings.
class sentence {
 public:
  sentence &operator<<(std::string_view text) noexcept;
  sentence &operator<<(double number) noexcept;
  sentence &operator<<(std::uint64_t number) noexcept;
  sentence &operator<<(std::int64_t number) noexcept;
  sentence &operator<<(std::uint32_t number) noexcept { return *this << std::uint64_t{number}; }
  sentence &operator<<(std::int32_t number) noexcept { return *this << std::int64_t{number}; }

  [[nodiscard]] std::string_view text() const noexcept { return {text_, length_}; }

 private:
  template <class Number>
  void append_number(Number number) noexcept;

  static constexpr std::size_t capacity = 232;
  char text_[capacity];
  std::size_t length_ = 0;
};

}  // namespace doors
