// SPDX-License-Identifier: MIT
#include "platform/fork.hpp"

#include <pthread.h>

#include <array>
#include <atomic>
#include <mutex>

namespace platform {
namespace {

constexpr auto rank_count = static_cast<std::size_t>(fork_rank::count);

constinit std::array<std::atomic<const fork_handlers *>, rank_count> participants{};
// Held by the fork under way; two threads may fork at once.
constinit std::mutex forking;
// Under forking. A fork that begins while the library is being loaded must end with those that it began with.
constinit std::array<const fork_handlers *, rank_count> taking_part{};

void before() {
  forking.lock();
  for (std::size_t rank = 0; rank < rank_count; ++rank) {
    taking_part[rank] = participants[rank].load(std::memory_order_acquire);
    if (taking_part[rank]) taking_part[rank]->before();
  }
}

void after(void (*fork_handlers::*handler)() noexcept) {
  for (std::size_t rank = rank_count; rank-- > 0;)
    if (taking_part[rank]) (taking_part[rank]->*handler)();
  forking.unlock();
}

void after_in_parent() {
  after(&fork_handlers::after_in_parent);
}

void after_in_child() {
  after(&fork_handlers::after_in_child);
}

}  // namespace

fork_participation::fork_participation(fork_rank rank, const fork_handlers &handlers) noexcept {
  static const int registered = pthread_atfork(&before, &after_in_parent, &after_in_child);
  (void)registered;
  participants[static_cast<std::size_t>(rank)].store(&handlers, std::memory_order_release);
}

}  // namespace platform
