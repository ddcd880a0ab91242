// Ends of the process while other threads compute: arguments "exit" or "return". Handlers of atexit and the destructor
// of a library call the library meanwhile. SPDX-License-Identifier: MIT
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <thread>

#include "lifetime/caller.hpp"

namespace {

lifetime::shared_objects *shared = nullptr;

void call_at_exit() {
  if (!lifetime::caller(*shared, 9).call_all()) _exit(2);
}

}  // namespace

int main(int argc, char **argv) {
  alarm(60);
  if (!std::freopen("/dev/null", "w", stdout)) return EXIT_FAILURE;  // codes that are recorded are also written there
  (void)std::atexit(&call_at_exit);
  shared = new lifetime::shared_objects;  // used to the end
  for (int i = 0; i < 3; ++i)
    std::thread([i] {
      auto *const own = new lifetime::caller(*shared, i);
      for (;;) (void)own->call_all();
    }).detach();
  std::this_thread::sleep_for(std::chrono::milliseconds(200));
  if (argc > 1 && std::strcmp(argv[1], "exit") == 0) std::exit(EXIT_SUCCESS);
  return EXIT_SUCCESS;
}
