// SPDX-License-Identifier: MIT
#include "terminal/progress.hpp"

#include <fmt/core.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>

#include "terminal/console.hpp"
#include "terminal/interruption.hpp"

namespace tool {

using namespace std::chrono_literals;

progress::progress(std::string label)
    : label_(std::move(label)), terminal_(redraws_lines(STDERR_FILENO)), start_(clock::now()), next_(start_ + 400ms) {}

progress::~progress() {
  if (!shown_) return;
  (void)std::fputs("\r\033[K", stderr);
  set_bar_shown(false);
}

void progress::update(std::uint64_t done, std::uint64_t total) {
  const auto now = clock::now();
  if (!terminal_ || now < next_) return;
  next_ = now + 100ms;
  const double elapsed = std::chrono::duration<double>(now - start_).count();
  std::string line;
  if (total == 0) {
    line = fmt::format("{} {:.0f} s", label_, elapsed);
  } else {
    const double part = std::min(static_cast<double>(done) / static_cast<double>(total), 1.0);
    const std::string share = fmt::format("{:3.0f} %", part * 100);
    const std::string left = part > 0.01 ? fmt::format(" {:.0f} s left", elapsed * (1 / part - 1)) : "";
    const std::size_t around = label_.size() + share.size() + 4 + std::max<std::size_t>(left.size(), 12);
    // The last column stays free: some terminals begin a new line behind it.
    const std::size_t width = columns_of(STDERR_FILENO) - 1;
    const std::size_t room = width > around + 4 ? std::min<std::size_t>(width - around, 50) : 0;
    const auto filled = static_cast<std::size_t>(part * static_cast<double>(room));
    const std::string bar = room > 0 ? fmt::format(" [{:#<{}}{:.<{}}]", "", filled, "", room - filled) : "";
    line = fmt::format("{}{} {}{}", label_, bar, share, left);
    if (line.size() > width) line.resize(width);
  }
  fmt::print(stderr, "\r{}\033[K", line);
  (void)std::fflush(stderr);
  if (!shown_) set_bar_shown(true);
  shown_ = true;
}

}  // namespace tool
