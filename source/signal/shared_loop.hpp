// Loops over arrays that several threads share, a turn at a time. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <atomic>
#include <bit>
#include <cstddef>

#include "signal/workers.hpp"

namespace dsp {

// Nanoseconds on a core of 2 GHz: what a byte of an array takes to come or go; the share of the work that is worth a
// thread, which comes late by a third of that; and how long a thread works before it looks for more.
inline constexpr double memory_cost = 0.03, worth_a_thread = 32000, time_of_turn = 8000;

/// What share() does for more threads than one. Not inline, and nothing is passed by address: short loops of one thread
/// are not to pay for it.
template <class Loop, class... Arrays>
[[gnu::noinline]] void share_by_cost(std::size_t threads, double arithmetic, Loop loop, Arrays... arrays) noexcept {
  const std::size_t n = std::min({arrays.size()...});
  const double cost = arithmetic + memory_cost * static_cast<double>((sizeof(typename Arrays::value_type) + ...));
  const double worth = static_cast<double>(n) * cost / worth_a_thread;
  if (worth < 2) return loop(arrays...);

  constexpr double most = 1024;  // where there are fewer, the others' parts find nothing left
  constexpr std::size_t shortest = 64;
  const double parts = std::min(worth, threads == 0 ? most : static_cast<double>(threads));
  const std::size_t turn = std::bit_ceil(std::max(shortest, static_cast<std::size_t>(time_of_turn / cost)));
  std::atomic<std::size_t> next{0};
  run_parts(static_cast<std::size_t>(parts), [&](std::size_t) {
    for (std::size_t first = next.fetch_add(turn); first < n; first = next.fetch_add(turn))
      loop(arrays.subspan(first, std::min(turn, n - first))...);
  });
}

/// Runs loop(arrays...) or, where there is enough to do, loop(the same part of each array...) for all parts, of which
/// each begins at a multiple of 64 elements (of 1024 below 4 ns an element). Arrays are spans of one length. An element
/// takes the loop `arithmetic` nanoseconds beside what its bytes take; better less than more.
template <class Loop, class... Arrays>
void share(std::size_t threads, double arithmetic, Loop loop, Arrays... arrays) noexcept {
  if (threads == 1) return loop(arrays...);
  share_by_cost(threads, arithmetic, loop, arrays...);
}

}  // namespace dsp
