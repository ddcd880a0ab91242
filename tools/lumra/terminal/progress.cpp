// SPDX-License-Identifier: MIT
#include "terminal/progress.hpp"

#include <fmt/format.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>

#include "terminal/interruption.hpp"

namespace tool {
namespace {

using namespace std::chrono_literals;

std::size_t terminal_width() noexcept {
  winsize size = {};
  return ::ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col : 80;
}

}  // namespace

progress::progress(std::string label)
    : label_(std::move(label)), terminal_(::isatty(STDERR_FILENO) == 1), start_(clock::now()), next_(start_ + 400ms) {}

progress::~progress() {
  if (!shown_) return;
  (void)std::fputs("\r\033[K", stderr);
  set_bar_shown(false);
}

void progress::update(std::uint64_t done, std::uint64_t total) {
  const auto now = clock::now();
  if (!terminal_ || now < next_) return;
  next_ = now + 100ms;
  const double part = static_cast<double>(done) / static_cast<double>(std::max<std::uint64_t>(total, 1));
  const double elapsed = std::chrono::duration<double>(now - start_).count();
  const std::string left = part > 0.01 ? fmt::format("{:.0f} s left", elapsed * (1 / part - 1)) : "";
  const std::size_t around = label_.size() + 24;
  const std::size_t width = terminal_width();
  const std::size_t room = width > around + 10 ? std::min<std::size_t>(width - around, 50) : 0;
  const auto filled = static_cast<std::size_t>(part * static_cast<double>(room));
  fmt::print(stderr, "\r{} [{:#<{}}{:.<{}}] {:3.0f} % {}\033[K", label_, "", filled, "", room - filled, part * 100,
             left);
  (void)std::fflush(stderr);
  if (!shown_) set_bar_shown(true);
  shown_ = true;
}

}  // namespace tool
