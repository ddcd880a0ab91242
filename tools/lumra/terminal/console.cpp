// SPDX-License-Identifier: MIT
#include "terminal/console.hpp"

#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>

namespace tool {
std::size_t width_of(std::string_view text) noexcept {
  return static_cast<std::size_t>(
      std::count_if(text.begin(), text.end(), [](char c) { return (static_cast<unsigned char>(c) & 0xC0) != 0x80; }));
}

std::size_t columns_of(int stream) noexcept {
  winsize size = {};
  return ::ioctl(stream, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col : 80;
}

bool redraws_lines(int stream) noexcept {
  const char *terminal = std::getenv("TERM");
  return ::isatty(stream) == 1 && terminal && *terminal && std::string_view(terminal) != "dumb";
}

bool is_styled(int stream) noexcept {
  const char *refused = std::getenv("NO_COLOR");
  return redraws_lines(stream) && !(refused && *refused);
}

std::string wrapped(std::string_view text, std::size_t width, std::size_t indent) {
  std::string result;
  std::size_t column = indent;
  for (bool first = true; !text.empty(); first = false) {
    const std::size_t end = std::min(text.find(' ', 1), text.size());
    std::string_view word = text.substr(0, end);
    text.remove_prefix(end);
    if (!first && column + width_of(word) > width) {
      result += '\n' + std::string(indent, ' ');
      column = indent;
      while (word.starts_with(' ')) word.remove_prefix(1);
    }
    result += word;
    column += width_of(word);
  }
  return result;
}

}  // namespace tool
