// A library that uses the library until its very end: its destructor still calls every family.
// SPDX-License-Identifier: MIT
#include <unistd.h>

#include "lifetime/caller.hpp"

namespace {

[[gnu::destructor]] void call_at_the_end() {
  lifetime::shared_objects shared;
  if (!lifetime::caller(shared, 8).call_all()) _exit(3);
}

}  // namespace
