// Mixed calls of all families from eight threads. Argument: number of calls. SPDX-License-Identifier: MIT
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <thread>
#include <vector>

#include <atomic>

#include "lifetime/caller.hpp"

int main(int argc, char **argv) {
  constexpr int threads = 8;
  const long calls = argc > 1 ? std::atol(argv[1]) : 10000;
  if (!std::freopen("/dev/null", "w", stdout)) return EXIT_FAILURE;  // codes that are recorded are also written there
  lifetime::shared_objects shared;
  std::atomic<long> next{0}, failed{0};
  {
    std::vector<std::jthread> callers;
    for (int number = 0; number < threads; ++number)
      callers.emplace_back([&, number] {
        lifetime::caller own(shared, number);
        // Families in another order on each thread, and the long ones seldom.
        for (long call = next++; call < calls; call = next++) {
          const auto draw = static_cast<unsigned long>(call) * 2654435761UL >> 7;
          const int family = static_cast<int>(draw % 64);
          if (!own.call(family == 0 ? lifetime::family_count - 1 : family % (lifetime::family_count - 1))) ++failed;
        }
      });
  }
  std::fprintf(stderr, "%ld calls, %ld failed\n", calls, failed.load());
  return failed == 0 ? EXIT_SUCCESS : EXIT_FAILURE;
}
