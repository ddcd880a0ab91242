// SPDX-License-Identifier: MIT
#include "terminal/interruption.hpp"

#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <climits>
#include <cstring>
#include <iterator>

#include "terminal/failure.hpp"

namespace tool {
namespace {

constexpr int signals[] = {SIGINT, SIGTERM, SIGHUP, SIGPIPE, SIGQUIT, SIGXCPU};
constexpr int crashes[] = {SIGABRT, SIGBUS, SIGFPE, SIGILL, SIGSEGV};

struct slot {
  std::atomic<bool> taken{false};
  std::atomic<bool> armed{false};  // the handler reads the name only then
  char name[PATH_MAX] = {};
};
slot slots[1024];  // two for each channel of a recording that is taken apart; untouched pages take no memory
std::atomic<bool> bar_shown{false};

void end_by_signal(int number) {
  abandon_work();
  // The disposition is the default one again (SA_RESETHAND); the signal arrives when the handler returns.
  (void)::raise(number);
}

sigset_t all_signals() noexcept {
  sigset_t all;
  sigemptyset(&all);
  for (const int number : signals) sigaddset(&all, number);
  return all;
}

}  // namespace

/// Calls only functions that POSIX allows in a handler.
void abandon_work() noexcept {
  for (slot &s : slots)
    if (s.armed) ::unlink(s.name);
  if (bar_shown) (void)!::write(STDERR_FILENO, "\n", 1);
}

void install_interruption() {
  struct sigaction action = {};
  action.sa_handler = end_by_signal;
  action.sa_flags = static_cast<int>(SA_RESETHAND);
  action.sa_mask = all_signals();
  for (const int number : signals) {
    struct sigaction before = {};
    // A signal that whoever started the program ignores (nohup, a job in the background) stays ignored.
    if (::sigaction(number, nullptr, &before) == 0 && before.sa_handler != SIG_IGN)
      (void)::sigaction(number, &action, nullptr);
  }
  for (const int number : crashes) (void)::sigaction(number, &action, nullptr);
  (void)std::signal(SIGXFSZ, SIG_IGN);
}

unfinished_file::unfinished_file(const std::filesystem::path &file) : slot_(-1) {
  const std::string name = std::filesystem::absolute(file).string();
  if (name.size() >= sizeof slot::name) throw failure("{}: name too long; use a shorter one", file.string());
  const auto *free = std::find_if(std::begin(slots), std::end(slots), [](slot &s) { return !s.taken.exchange(true); });
  if (free == std::end(slots))
    throw failure("{}: is one of more than {} output files; write fewer at once", file.string(), std::size(slots));
  slot_ = static_cast<int>(free - slots);
  slot &mine = slots[slot_];
  std::copy_n(name.c_str(), name.size() + 1, mine.name);
  mine.armed = true;
}

unfinished_file::~unfinished_file() {
  if (slots[slot_].armed) ::unlink(slots[slot_].name);
  is_finished();
  slots[slot_].taken = false;
}

void unfinished_file::is_finished() noexcept {
  slots[slot_].armed = false;
}

held_signals::held_signals() noexcept {
  const sigset_t all = all_signals();
  (void)::pthread_sigmask(SIG_BLOCK, &all, &before_);
}

held_signals::~held_signals() {
  (void)::pthread_sigmask(SIG_SETMASK, &before_, nullptr);
}

void set_bar_shown(bool shown) noexcept {
  bar_shown = shown;
}

}  // namespace tool
